#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "tests/powerloss/DiskFormat.h"

namespace marrowdale::tests {

// The file system in an image file, mounted on a folder through a loop device for as long as the
// object lives. The device frees itself with its last user, so it goes with the mount namespace,
// however this process ends. Only root may.
class LoopMount {
  public:
    // Errors: there are no loop devices (ENOENT, EPERM, …); the kernel does not know the file
    // system (ENODEV), or does not take what is in the image.
    [[nodiscard]] static Expected<LoopMount> mount(const std::string& image,
                                                   const std::string& folder,
                                                   const DiskFormat& format);
    LoopMount(LoopMount&& other) noexcept;
    LoopMount& operator=(LoopMount&&) = delete;
    ~LoopMount();

  private:
    LoopMount(std::string folder, std::string device)
        : folder_(std::move(folder)), device_(std::move(device)) {}

    std::string folder_;  // empty: nothing is mounted
    std::string device_;
};

}  // namespace marrowdale::tests
