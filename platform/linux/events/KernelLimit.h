#pragma once

#include <cstdint>
#include <string>

namespace marrowdale::native {

// A limit that the kernel shows as a number in a file below /proc/sys/fs ("inotify/max_…"); 0 where
// it shows none.
[[nodiscard]] std::uint64_t kernelLimit(const std::string& name);

}  // namespace marrowdale::native
