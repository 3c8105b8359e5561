#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

namespace marrowdale::native {

// One event as inotify tells it.
struct InotifyRecord {
    int watch = -1;
    std::uint32_t mask = 0;    // IN_…, unknown bits too
    std::uint32_t cookie = 0;  // the same for both halves of a rename
    std::string_view name;     // lies in the buffer; empty for what is watched itself
};

// Takes the bytes of one read from an inotify group apart. It never looks beyond them, whatever
// they are; where a length makes no sense it ends.
class InotifyRecords {
  public:
    // The bytes stay the caller's and outlive the records.
    explicit InotifyRecords(std::span<const std::byte> bytes) : rest_(bytes) {}

    // No value at the end.
    [[nodiscard]] std::optional<InotifyRecord> next();
    // Whether it ended before the bytes did, because they are no events.
    [[nodiscard]] bool isMalformed() const { return malformed_; }

  private:
    std::span<const std::byte> rest_;
    bool malformed_ = false;
};

}  // namespace marrowdale::native
