#include "host/browser/HttpHead.h"

#include <algorithm>
#include <charconv>

namespace marrowdale::host {

namespace {

using Fault = std::unexpected<HeadFault>;

constexpr std::size_t mostFields = 100;
constexpr std::string_view lineEnd = "\r\n";

bool isTokenCharacter(char character) {
    constexpr std::string_view others = "!#$%&'*+-.^_`|~";
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
           (character >= '0' && character <= '9') || others.contains(character);
}

bool isToken(std::string_view text) {
    return !text.empty() && std::ranges::all_of(text, isTokenCharacter);
}

bool isTarget(std::string_view text) {
    return text.starts_with('/') && std::ranges::all_of(text, [](char character) {
               return character > ' ' && character < '\x7F' && character != '#';
           });
}

bool isFieldValue(std::string_view text) {
    return std::ranges::all_of(text, [](char character) {
        return character == '\t' ||
               (static_cast<unsigned char>(character) >= ' ' && character != '\x7F');
    });
}

std::string lowerCase(std::string_view text) {
    std::string lower(text);
    std::ranges::transform(lower, lower.begin(), [](char character) {
        return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a')
                                                    : character;
    });
    return lower;
}

std::string_view withoutSpaces(std::string_view text) {
    const std::size_t begin = std::min(text.find_first_not_of(" \t"), text.size());
    text.remove_prefix(begin);
    return text.substr(0, text.find_last_not_of(" \t") + 1);
}

// The line that the bytes begin with, which are then without it and its end.
std::string_view takeLine(std::string_view& bytes) {
    const std::size_t end = bytes.find(lineEnd);
    const std::string_view line = bytes.substr(0, end);
    bytes.remove_prefix(std::min(end + lineEnd.size(), bytes.size()));
    return line;
}

std::optional<HeadFault> takeFirstLine(std::string_view line, HttpHead& head) {
    const std::size_t first = line.find(' ');
    const std::size_t last = line.rfind(' ');
    if (first == std::string_view::npos || first == last) {
        return HeadFault::malformed;
    }
    head.method = line.substr(0, first);
    head.target = line.substr(first + 1, last - first - 1);
    if (!isToken(head.method) || !isTarget(head.target)) {
        return HeadFault::malformed;
    }
    const std::string_view version = line.substr(last + 1);
    if (version != "HTTP/1.1") {
        return version.starts_with("HTTP/") ? HeadFault::unknownVersion : HeadFault::malformed;
    }
    return std::nullopt;
}

bool takeField(std::string_view line, HttpHead& head) {
    const std::size_t colon = line.find(':');
    if (colon == std::string_view::npos || !isToken(line.substr(0, colon))) {
        return false;
    }
    const std::string_view value = withoutSpaces(line.substr(colon + 1));
    if (!isFieldValue(value) || head.fields.size() == mostFields) {
        return false;
    }
    head.fields.emplace_back(lowerCase(line.substr(0, colon)), value);
    return true;
}

std::optional<HeadFault> takeLength(HttpHead& head) {
    if (head.count("transfer-encoding") > 0) {
        return HeadFault::unknownEncoding;
    }
    if (head.count("content-length") == 0) {
        return std::nullopt;
    }
    const std::string_view text = head.field("content-length").value_or("");
    const char* const end = text.data() + text.size();
    const auto parsed = std::from_chars(text.data(), end, head.contentLength);
    if (text.empty() || parsed.ec != std::errc() || parsed.ptr != end) {
        return HeadFault::malformed;
    }
    head.hasLength = true;
    return std::nullopt;
}

}  // namespace

std::expected<std::optional<std::size_t>, HeadFault> HttpHead::endOf(std::string_view bytes) {
    const std::string_view looked = bytes.substr(0, longestHead);
    const std::size_t end = looked.find("\r\n\r\n");
    const std::string_view head = looked.substr(0, end);
    for (std::size_t at = head.find('\n'); at != std::string_view::npos;
         at = head.find('\n', at + 1)) {
        if (at == 0 || head[at - 1] != '\r') {
            return Fault(HeadFault::malformed);
        }
    }
    if (end != std::string_view::npos) {
        return end + 2 * lineEnd.size();
    }
    if (bytes.size() >= longestHead) {
        return Fault(HeadFault::tooLarge);
    }
    return std::nullopt;
}

std::expected<HttpHead, HeadFault> HttpHead::parsed(std::string_view bytes) {
    HttpHead head;
    if (const auto fault = takeFirstLine(takeLine(bytes), head)) {
        return Fault(*fault);
    }
    for (std::string_view line = takeLine(bytes); !line.empty(); line = takeLine(bytes)) {
        if (!takeField(line, head)) {
            return Fault(HeadFault::malformed);
        }
    }
    if (const auto fault = takeLength(head)) {
        return Fault(*fault);
    }
    const std::string connection = lowerCase(head.field("connection").value_or(""));
    head.keepsAlive = !connection.contains("close");
    return head;
}

std::optional<std::string_view> HttpHead::field(std::string_view name) const {
    const auto found = std::ranges::find(fields, name, [](const auto& each) { return each.first; });
    if (found == fields.end() || count(name) != 1) {
        return std::nullopt;
    }
    return found->second;
}

std::size_t HttpHead::count(std::string_view name) const {
    return static_cast<std::size_t>(
        std::ranges::count(fields, name, [](const auto& each) { return each.first; }));
}

}  // namespace marrowdale::host
