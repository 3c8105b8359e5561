#pragma once

#include <cstdint>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

// How far the log was committed, and the last identifiers in it.
struct LogPosition {
    std::uint64_t segment = 0;
    std::uint64_t offset = 0;  // behind the last committed frame
    std::uint64_t sequence = 0;
    std::uint64_t lastEvent = 0;
    std::uint32_t lastDocument = 0;
};

// The small file that says so: the head in the store, and its copy, the witness, elsewhere. One
// thread.
class StoreHead {
  public:
    StoreHead() = default;
    // Makes the file or replaces what is in it.
    [[nodiscard]] static Expected<StoreHead> create(const std::string& path, const UUID& store,
                                                    const LogPosition& position);
    // Damage where it does not check or is another store's.
    [[nodiscard]] static Expected<StoreHead> open(const std::string& path, const UUID& store);

    explicit operator bool() const { return static_cast<bool>(file_); }
    [[nodiscard]] const LogPosition& position() const { return position_; }
    // One write, not synced.
    [[nodiscard]] Expected<void> write(const LogPosition& position);
    [[nodiscard]] Expected<void> sync() const { return file_.sync(); }

  private:
    DiskFile file_;
    UUID store_;
    LogPosition position_;
};

}  // namespace marrowdale::native
