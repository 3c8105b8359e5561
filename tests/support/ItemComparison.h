#pragma once

#include <string>

#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale {

// Every field of an item as text, a line each, so that a test which compares two items says which
// field differs.
[[nodiscard]] std::string allFields(const FileProviderItem& item);

}  // namespace marrowdale
