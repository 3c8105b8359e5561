#include "host/cli/PrintedItems.h"

#include <charconv>
#include <cstdint>
#include <optional>

namespace marrowdale::host {

namespace {

// A number that stands for a "did=" or "fid=" identifier alone; none where it does not fit.
std::optional<std::uint64_t> numberOf(std::string_view identifier) {
    const bool isDocument = identifier.starts_with("did=");
    if (!isDocument && !identifier.starts_with("fid=")) {
        return std::nullopt;
    }
    std::uint64_t number = 0;
    const char* const end = identifier.data() + identifier.size();
    const auto parsed = std::from_chars(identifier.data() + 4, end, number);
    const bool isCanonical =
        identifier.size() == 5 || (identifier.size() > 5 && identifier[4] != '0');
    if (parsed.ec != std::errc() || parsed.ptr != end || !isCanonical || (number >> 63U) != 0) {
        return std::nullopt;
    }
    return (number << 1U) | (isDocument ? 1U : 0U);
}

}  // namespace

bool PrintedItems::wasPrintedBefore(std::string_view identifier) {
    if (const auto number = numberOf(identifier)) {
        if (numbersBefore_.contains(*number)) {
            return true;
        }
        numbersOfThisPass_.push_back(*number);
        return false;
    }
    std::string text(identifier);
    if (othersBefore_.contains(text)) {
        return true;
    }
    othersOfThisPass_.push_back(std::move(text));
    return false;
}

void PrintedItems::startOver() {
    numbersBefore_.insert(numbersOfThisPass_.begin(), numbersOfThisPass_.end());
    othersBefore_.insert(othersOfThisPass_.begin(), othersOfThisPass_.end());
    numbersOfThisPass_.clear();
    othersOfThisPass_.clear();
}

}  // namespace marrowdale::host
