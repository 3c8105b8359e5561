#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Record.h"

namespace marrowdale::native {

// What a snapshot says besides the rows.
struct SnapshotHeader {
    std::uint64_t segment = 0;   // replay goes on at its first frame
    std::uint64_t sequence = 0;  // of the last frame in the snapshot
    std::uint64_t lastEvent = 0;
    std::uint32_t lastDocument = 0;
};

struct LoadedSnapshot {
    SnapshotHeader header;
    std::vector<EventGap> gaps;
    std::uint64_t bytes = 0;
};

// Writes the index to `path` + ".new", syncs it and renames it to `path`; the folder is synced.
// Answers the size. The index must have no dirty rows. What is there stays when it fails.
[[nodiscard]] Expected<std::uint64_t> writeSnapshot(const std::string& path, const UUID& store,
                                                    const SnapshotHeader& header,
                                                    const Index& index,
                                                    const std::vector<EventGap>& gaps);

// Reads the rows and names into the empty `index` (which is not finished). No value when there is
// no snapshot. Damage and later formats as StoreDamage.h has it.
[[nodiscard]] Expected<std::optional<LoadedSnapshot>> readSnapshot(const std::string& path,
                                                                   const UUID& store, Index& index);

}  // namespace marrowdale::native
