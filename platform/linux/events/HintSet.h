#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

// Hints that came together, each place once. One thread.
class HintSet {
  public:
    // All that was told of one place.
    struct Hint {
        std::uint32_t what = 0;  // WatchHint's bits
        FileID folder{};
        std::string name;  // empty: the folder itself
        // With movedTo: where the last thing that was moved there came from, and its fingerprint.
        FileID fromFolder{};
        std::string fromName;
        std::uint32_t fingerprint = 0;
    };

    void add(const WatchHint& hint);
    void add(const Hint& hint);
    [[nodiscard]] bool empty() const { return places_.empty() && files_.empty(); }
    [[nodiscard]] std::size_t size() const { return places_.size() + files_.size(); }
    // Everything so far, the places of each folder together; nothing is left.
    [[nodiscard]] std::vector<Hint> takePlaces();
    // Watched files of which something was told.
    [[nodiscard]] std::vector<FileID> takeFiles();

  private:
    void merge(Hint hint);

    std::unordered_map<std::string, Hint> places_;  // by folder and name
    std::vector<FileID> files_;
};

}  // namespace marrowdale::native
