#include "platform/linux/events/KernelLimit.h"

#include <fstream>

namespace marrowdale::native {

std::uint64_t kernelLimit(const std::string& name) {
    std::ifstream file("/proc/sys/fs/" + name);
    std::uint64_t limit = 0;
    return file >> limit ? limit : 0;
}

}  // namespace marrowdale::native
