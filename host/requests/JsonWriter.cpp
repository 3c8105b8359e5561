#include "host/requests/JsonWriter.h"

#include <array>
#include <charconv>
#include <utility>

#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

namespace {

template <typename Value>
void appendNumber(std::string& out, Value value) {
    std::array<char, 32> buffer{};
    const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), value).ptr;
    out.append(buffer.data(), end);
}

void appendCodeUnit(std::string& out, char32_t unit) {
    constexpr std::string_view digits = "0123456789abcdef";
    out += "\\u";
    for (const unsigned shift : {12U, 8U, 4U, 0U}) {
        out += digits[(unit >> shift) & 0xFU];
    }
}

void appendASCII(std::string& out, char c) {
    switch (c) {
        case '"':
        case '\\':
            out += '\\';
            out += c;
            return;
        case '\n':
            out += "\\n";
            return;
        case '\t':
            out += "\\t";
            return;
        case '\r':
            out += "\\r";
            return;
        default:
            break;
    }
    if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) {
        appendCodeUnit(out, static_cast<unsigned char>(c));
    } else {
        out += c;
    }
}

// Beyond ASCII, for readers that split lines as Unicode has it.
bool endsALine(char32_t codePoint) {
    return codePoint == 0x85 || codePoint == 0x2028 || codePoint == 0x2029;
}

}  // namespace

void appendJsonString(std::string& out, std::string_view text) {
    out += '"';
    while (!text.empty()) {
        const auto [codePoint, length] = leadingCharacter(text);
        if (length == 0) {
            appendCodeUnit(out, 0xDC00U | static_cast<unsigned char>(text.front()));
        } else if (length == 1) {
            appendASCII(out, text.front());
        } else if (endsALine(codePoint)) {
            appendCodeUnit(out, codePoint);
        } else {
            out += text.substr(0, length);
        }
        text.remove_prefix(length == 0 ? 1 : length);
    }
    out += '"';
}

void JsonWriter::separate() {
    if (needsComma_) {
        text_ += ',';
    }
    needsComma_ = true;
}

JsonWriter& JsonWriter::beginObject() {
    separate();
    text_ += '{';
    needsComma_ = false;
    return *this;
}

JsonWriter& JsonWriter::endObject() {
    text_ += '}';
    needsComma_ = true;
    return *this;
}

JsonWriter& JsonWriter::beginArray() {
    separate();
    text_ += '[';
    needsComma_ = false;
    return *this;
}

JsonWriter& JsonWriter::endArray() {
    text_ += ']';
    needsComma_ = true;
    return *this;
}

JsonWriter& JsonWriter::key(std::string_view name) {
    separate();
    appendJsonString(text_, name);
    text_ += ':';
    needsComma_ = false;
    return *this;
}

JsonWriter& JsonWriter::string(std::string_view text) {
    separate();
    appendJsonString(text_, text);
    return *this;
}

JsonWriter& JsonWriter::number(std::uint64_t value) {
    separate();
    appendNumber(text_, value);
    return *this;
}

JsonWriter& JsonWriter::number(std::int64_t value) {
    separate();
    appendNumber(text_, value);
    return *this;
}

JsonWriter& JsonWriter::number(double value) {
    separate();
    appendNumber(text_, value);
    return *this;
}

JsonWriter& JsonWriter::boolean(bool value) {
    separate();
    text_ += value ? "true" : "false";
    return *this;
}

JsonWriter& JsonWriter::null() {
    separate();
    text_ += "null";
    return *this;
}

std::string JsonWriter::take() {
    needsComma_ = false;
    return std::exchange(text_, {});
}

}  // namespace marrowdale::host
