#include "host/requests/JsonReading.h"

#include <charconv>

#include <nlohmann/json.hpp>

#include "platform/foundation/Base64.h"

namespace marrowdale::host {

namespace {

constexpr int deepestNesting = 64;

// The code unit of an escape \uXXXX at the beginning of a text.
std::optional<unsigned> escapedUnit(std::string_view text) {
    if (text.size() < 6 || !text.starts_with("\\u")) {
        return std::nullopt;
    }
    unsigned unit = 0;
    const char* const end = text.data() + 6;
    const auto parsed = std::from_chars(text.data() + 2, end, unit, 16);
    return parsed.ptr == end && parsed.ec == std::errc() ? std::optional(unit) : std::nullopt;
}

bool isHighSurrogate(unsigned unit) {
    return unit >= 0xD800 && unit < 0xDC00;
}

// The library refuses a lone surrogate. Each that stands for a byte is written as a null character
// and the byte's two digits, and a null character as one and "00".
class Preparation {
  public:
    // False when it is nested too deeply.
    [[nodiscard]] bool run(std::string_view text) {
        out_.reserve(text.size());
        while (!text.empty()) {
            const std::size_t length = isInText_ ? inText(text) : outside(text);
            if (depth_ > deepestNesting) {
                return false;
            }
            text.remove_prefix(length);
        }
        return true;
    }
    [[nodiscard]] const std::string& result() const { return out_; }

  private:
    std::size_t copy(std::string_view text, std::size_t length) {
        length = std::min(length, text.size());
        out_ += text.substr(0, length);
        return length;
    }
    std::size_t outside(std::string_view text) {
        const char character = text.front();
        isInText_ = character == '"';
        depth_ += character == '[' || character == '{' ? 1 : 0;
        depth_ -= character == ']' || character == '}' ? 1 : 0;
        return copy(text, 1);
    }
    std::size_t inText(std::string_view text) {
        if (text.front() != '\\') {
            isInText_ = text.front() != '"';
            return copy(text, 1);
        }
        const auto unit = escapedUnit(text);
        if (!unit) {
            return copy(text, 2);
        }
        if (isHighSurrogate(*unit)) {
            return copy(text, 12);
        }
        if (*unit == 0) {
            out_ += "\\u000000";
            return 6;
        }
        if (*unit >= 0xDC80 && *unit <= 0xDCFF) {
            out_ += "\\u0000";
            out_ += text.substr(4, 2);
            return 6;
        }
        return copy(text, 6);
    }

    std::string out_;
    bool isInText_ = false;
    int depth_ = 0;
};

std::string withBytes(const std::string& prepared) {
    std::string text;
    std::size_t position = 0;
    while (position < prepared.size()) {
        const std::size_t null = std::min(prepared.find('\0', position), prepared.size());
        text.append(prepared, position, null - position);
        position = null;
        if (position + 3 <= prepared.size()) {
            unsigned value = 0;
            std::from_chars(&prepared[position + 1], &prepared[position] + 3, value, 16);
            text += static_cast<char>(value);
            position += 3;
        }
    }
    return text;
}

const nlohmann::json* member(const nlohmann::json& object, const char* key) {
    if (!object.is_object()) {
        return nullptr;
    }
    const auto found = object.find(key);
    return found == object.end() ? nullptr : &*found;
}

}  // namespace

std::optional<nlohmann::json> parsedJson(std::string_view text) {
    Preparation preparation;
    if (!preparation.run(text)) {
        return std::nullopt;
    }
    auto value = nlohmann::json::parse(preparation.result(), nullptr, false);
    return value.is_discarded() ? std::nullopt : std::optional(std::move(value));
}

std::optional<std::string> bytes(const nlohmann::json& text) {
    const auto* const prepared = text.get_ptr<const std::string*>();
    return prepared != nullptr ? std::optional(withBytes(*prepared)) : std::nullopt;
}

std::optional<std::string> textMember(const nlohmann::json& object, const char* key) {
    const nlohmann::json* const value = member(object, key);
    return value != nullptr ? bytes(*value) : std::nullopt;
}

std::optional<bool> booleanMember(const nlohmann::json& object, const char* key) {
    const nlohmann::json* const value = member(object, key);
    const auto* const boolean = value != nullptr ? value->get_ptr<const bool*>() : nullptr;
    return boolean != nullptr ? std::optional(*boolean) : std::nullopt;
}

std::optional<std::uint64_t> unsignedMember(const nlohmann::json& object, const char* key) {
    const nlohmann::json* const value = member(object, key);
    return value != nullptr && value->is_number_unsigned()
               ? std::optional(value->get<std::uint64_t>())
               : std::nullopt;
}

std::optional<Number> numberMember(const nlohmann::json& object, const char* key) {
    const nlohmann::json* const value = member(object, key);
    if (value == nullptr || !value->is_number()) {
        return std::nullopt;
    }
    if (value->is_number_float()) {
        return Number(value->get<double>());
    }
    if (value->is_number_unsigned() &&
        value->get<std::uint64_t>() > std::uint64_t{std::numeric_limits<std::int64_t>::max()}) {
        return Number(value->get<std::uint64_t>());
    }
    return Number(value->get<std::int64_t>());
}

std::optional<Date> dateMember(const nlohmann::json& object, const char* key) {
    const auto text = textMember(object, key);
    return text ? Date::fromRFC3339(*text) : std::nullopt;
}

std::optional<Data> dataMember(const nlohmann::json& object, const char* key) {
    const auto text = textMember(object, key);
    return text ? base64Decoded(*text) : std::nullopt;
}

const nlohmann::json* arrayMember(const nlohmann::json& object, const char* key) {
    const nlohmann::json* const value = member(object, key);
    return value != nullptr && value->is_array() ? value : nullptr;
}

}  // namespace marrowdale::host
