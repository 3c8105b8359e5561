#include "host/browser/ByteRange.h"

#include <algorithm>
#include <charconv>

namespace marrowdale::host {

namespace {

std::optional<std::uint64_t> numberIn(std::string_view text) {
    std::uint64_t number = 0;
    const auto parsed = std::from_chars(text.data(), text.data() + text.size(), number);
    return !text.empty() && parsed.ec == std::errc() && parsed.ptr == text.data() + text.size()
               ? std::optional(number)
               : std::nullopt;
}

// "-500": the last 500 bytes.
RequestedRange rangeAtTheEnd(std::string_view last, std::uint64_t size) {
    const auto wanted = numberIn(last);
    if (!wanted) {
        return {RangeKind::whole, {0, size}};
    }
    const std::uint64_t length = std::min(*wanted, size);
    return length == 0 ? RequestedRange{RangeKind::unreachable, {}}
                       : RequestedRange{RangeKind::part, {size - length, length}};
}

}  // namespace

RequestedRange requestedRange(std::optional<std::string_view> field, std::uint64_t size) {
    constexpr std::string_view unit = "bytes=";
    const RequestedRange whole{RangeKind::whole, {0, size}};
    if (!field || !field->starts_with(unit)) {
        return whole;
    }
    const std::string_view text = field->substr(unit.size());
    const std::size_t dash = text.find('-');
    if (dash == std::string_view::npos) {
        return whole;
    }
    if (dash == 0) {
        return rangeAtTheEnd(text.substr(1), size);
    }
    const auto first = numberIn(text.substr(0, dash));
    const std::string_view lastText = text.substr(dash + 1);
    const auto last = lastText.empty() ? std::optional(UINT64_MAX) : numberIn(lastText);
    if (!first || !last || *last < *first) {
        return whole;
    }
    if (*first >= size) {
        return {RangeKind::unreachable, {}};
    }
    const std::uint64_t end = std::min(*last, size - 1);
    return {RangeKind::part, {*first, end - *first + 1}};
}

}  // namespace marrowdale::host
