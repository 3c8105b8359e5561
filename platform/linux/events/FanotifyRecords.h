#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

namespace marrowdale::native {

// One event as fanotify tells it, in a group that reports handles and names. All views lie in the
// buffer that was read.
struct FanotifyRecord {
    // A name in a folder. `folder` is the folder's handle (FileHandle::bytes); `name` is empty for
    // the folder itself.
    struct Place {
        std::string_view folder;
        std::string_view name;
    };

    std::uint64_t mask = 0;      // FAN_…, unknown bits too
    std::optional<Place> place;  // where it happened, but for renames
    std::optional<Place> from;   // a rename's old place, where that folder is marked
    std::optional<Place> to;     // a rename's new place, likewise
    std::string_view thing;      // handle of what it happened to; empty: not told

    [[nodiscard]] bool isOverflow() const;
};

// Takes the bytes of one read from a fanotify group apart. It never looks beyond them, whatever
// they are: information of unknown kinds is passed over, and where a length makes no sense it ends.
class FanotifyRecords {
  public:
    // The bytes stay the caller's and outlive the records.
    explicit FanotifyRecords(std::span<const std::byte> bytes) : rest_(bytes) {}

    // No value at the end.
    [[nodiscard]] std::optional<FanotifyRecord> next();
    // Whether it ended before the bytes did, because they are no events: something that the kernel
    // told is then not known.
    [[nodiscard]] bool isMalformed() const { return malformed_; }

  private:
    std::span<const std::byte> rest_;
    bool malformed_ = false;
};

}  // namespace marrowdale::native
