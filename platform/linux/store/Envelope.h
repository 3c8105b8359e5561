#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

inline constexpr std::uint32_t storeFormatVersion = 1;
using Magic = std::array<char, 8>;

// The checksummed wrapping of the store's small files (docs/formats/store.md).
struct Envelope {
    UUID store;
    std::vector<std::byte> body;
};

[[nodiscard]] std::vector<std::byte> encodeEnvelope(const Magic& magic, const UUID& store,
                                                    std::span<const std::byte> body);
// Damage or a later format as StoreDamage.h has it.
[[nodiscard]] Expected<Envelope> readEnvelope(const DiskFile& file, const Magic& magic);

}  // namespace marrowdale::native
