#pragma once

#include <string>
#include <string_view>

#include "host/requests/JsonWriter.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Writes {"domain": …, "code": …, "name": …, "message": …} and what the kind brings along, with the
// operation and the subject that the message was made of.
void appendError(JsonWriter& writer, const Error& error);

// {"error": {…}}
[[nodiscard]] std::string errorJson(const Error& error);

// Reads it back; an answer that is none of ours is EPROTO.
[[nodiscard]] Error errorFromJson(std::string_view text);

}  // namespace marrowdale::host
