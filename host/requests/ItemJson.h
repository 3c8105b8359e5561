#pragma once

#include "host/requests/JsonWriter.h"
#include "platform/foundation/Date.h"
#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale::host {

// Writes an item as one object with the record's own field names. A field without a value is left
// out, and so is a date that RFC 3339 has no text for. Dates are RFC 3339 in UTC, bytes base64,
// numbers in full.
void appendItem(JsonWriter& writer, const FileProviderItem& item);

// Whether RFC 3339 has a text for the date: its years have four digits.
[[nodiscard]] bool isWithinRFC3339(const Date& date);

}  // namespace marrowdale::host
