#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace marrowdale::native {

// CRC-32C (Castagnoli) of the bytes; `before` is the checksum of what came before them, 0 at the
// start. Uses the processor's instruction where it has one.
[[nodiscard]] std::uint32_t crc32c(std::span<const std::byte> bytes, std::uint32_t before = 0);

// The same by table, on any processor.
[[nodiscard]] std::uint32_t crc32cByTable(std::span<const std::byte> bytes,
                                          std::uint32_t before = 0);

}  // namespace marrowdale::native
