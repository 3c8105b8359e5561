#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

// The lock of a state folder's one owner; given back when it goes, or when the process ends,
// however it ends.
class StoreLock {
  public:
    // Takes the lock on the file at `path` (made when missing) and writes this process's number
    // into it. Waits up to `wait` (no value: for ever) without polling: the owner's release or end
    // wakes it. EWOULDBLOCK with the owner's number when another has it at the deadline. `isServed`
    // (may be null) is asked while it waits, whenever something appears in the lock's folder: true
    // ends the waiting with EALREADY.
    [[nodiscard]] static Expected<StoreLock> take(const std::string& path,
                                                  std::optional<std::chrono::milliseconds> wait,
                                                  const std::function<bool()>& isServed = nullptr);

    StoreLock(StoreLock&&) = default;
    StoreLock& operator=(StoreLock&&) = delete;
    StoreLock(const StoreLock&) = delete;
    StoreLock& operator=(const StoreLock&) = delete;
    ~StoreLock();

  private:
    explicit StoreLock(DiskFile file) : file_(std::move(file)) {}
    DiskFile file_;
};

}  // namespace marrowdale::native
