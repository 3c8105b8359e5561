#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

namespace marrowdale::host {

// Which identifiers a listing has printed, so that a listing that starts over prints the others
// only. Within one pass nothing is left out: a document with two names is listed under each. Eight
// bytes an item, more only once a listing has started over. One thread.
class PrintedItems {
  public:
    // Whether an earlier pass printed it. If not, it counts as printed by this one.
    [[nodiscard]] bool wasPrintedBefore(std::string_view identifier);
    void startOver();

  private:
    std::vector<std::uint64_t> numbersOfThisPass_;
    std::vector<std::string> othersOfThisPass_;
    std::unordered_set<std::uint64_t> numbersBefore_;
    std::unordered_set<std::string> othersBefore_;
};

}  // namespace marrowdale::host
