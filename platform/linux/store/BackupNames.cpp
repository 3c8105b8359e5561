#include "platform/linux/store/BackupNames.h"

#include <algorithm>
#include <array>

namespace marrowdale::native {

namespace {

// ".~12~"
bool isNumberedSuffix(std::string_view suffix) {
    constexpr std::string_view start = ".~";
    if (!suffix.starts_with(start) || !suffix.ends_with('~') || suffix.size() <= start.size() + 1) {
        return false;
    }
    const auto digits = suffix.substr(start.size(), suffix.size() - start.size() - 1);
    return std::ranges::all_of(digits, [](char c) { return c >= '0' && c <= '9'; });
}

bool isHiddenName(std::string_view original, std::string_view candidate) {
    return candidate.size() > original.size() + 2 && candidate.front() == '.' &&
           candidate.substr(1).starts_with(original) && candidate[original.size() + 1] == '.';
}

}  // namespace

bool isBackupName(std::string_view original, std::string_view candidate) {
    if (original.empty()) {
        return false;
    }
    if (candidate.starts_with(original)) {
        constexpr std::array<std::string_view, 4> suffixes{"~", ".bak", ".orig", ".old"};
        const auto suffix = candidate.substr(original.size());
        return std::ranges::find(suffixes, suffix) != suffixes.end() || isNumberedSuffix(suffix);
    }
    const bool isMarked = candidate.size() == original.size() + 2 && candidate.front() == '#' &&
                          candidate.back() == '#' && candidate.substr(1).starts_with(original);
    return isMarked || isHiddenName(original, candidate);
}

}  // namespace marrowdale::native
