#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include <nlohmann/json_fwd.hpp>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/ResourceValue.h"

namespace marrowdale::host {

// Reads what JsonWriter writes, and what anybody may send: no exception, whatever the text is. For
// source files only. Any thread.

// The value of a text; none for anything that is no JSON, is nested deeper than 64 levels, or holds
// bytes that are no UTF-8. The escape \udcXX that stands for the byte 0xXX is taken; texts are to
// be read with `bytes` below, which turns it back.
[[nodiscard]] std::optional<nlohmann::json> parsedJson(std::string_view text);

// A member of an object in the type that it is wanted in; none when the value is no object, has no
// such member, or one of another type.
[[nodiscard]] std::optional<std::string> textMember(const nlohmann::json& object, const char* key);
[[nodiscard]] std::optional<bool> booleanMember(const nlohmann::json& object, const char* key);
[[nodiscard]] std::optional<std::uint64_t> unsignedMember(const nlohmann::json& object,
                                                          const char* key);
[[nodiscard]] std::optional<Number> numberMember(const nlohmann::json& object, const char* key);
[[nodiscard]] std::optional<Date> dateMember(const nlohmann::json& object, const char* key);
[[nodiscard]] std::optional<Data> dataMember(const nlohmann::json& object, const char* key);
// The array of that name; null when there is none.
[[nodiscard]] const nlohmann::json* arrayMember(const nlohmann::json& object, const char* key);

// The bytes of a text; none for a value of another type.
[[nodiscard]] std::optional<std::string> bytes(const nlohmann::json& text);

}  // namespace marrowdale::host
