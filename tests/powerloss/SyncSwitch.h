#pragma once

#include <cstdint>

namespace marrowdale::tests {

// Whether fsync and fdatasync do what they promise. This program's own stand before the C
// library's; what must reach the disk nevertheless calls the kernel by itself.
enum class Syncs : std::uint8_t {
    kept,
    ignored,  // they succeed and do nothing
};

void setSyncs(Syncs syncs);

}  // namespace marrowdale::tests
