#pragma once

#include <cstdint>
#include <string>

namespace marrowdale::host {

// "12 B", "3.4 kB", "120 MB", by powers of 1000.
[[nodiscard]] std::string readableSize(std::uint64_t bytes);

}  // namespace marrowdale::host
