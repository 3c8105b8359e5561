#pragma once

#include <cstdint>

#include "platform/foundation/Identifiers.h"

namespace marrowdale {

// How far the scan of a renamed folder has got, as a change token's `offset` says it.
//
// The lower 32 bits are the walked entries that were delivered. They mean something only as long as
// nothing leaves the folder, and the token has no field for when that was looked at; its event has
// to stay before that of the folder. So the upper bits say which deletion was the newest one when
// the scan began: its distance from the folder's event, 0 when there was none. A scan whose newest
// deletion is another one by now starts over, once, however often it is interrupted.
struct FSScanOffset {
    std::uint32_t position = 0;
    std::uint32_t newestDeletion = 0;

    [[nodiscard]] static FSScanOffset from(std::uint64_t offset) {
        return {.position = static_cast<std::uint32_t>(offset),
                .newestDeletion = static_cast<std::uint32_t>(offset >> 32U)};
    }
    [[nodiscard]] std::uint64_t value() const {
        return (std::uint64_t{newestDeletion} << 32U) | position;
    }
    // Of a deletion behind the folder's event; 0 for none.
    [[nodiscard]] static std::uint32_t distance(EventID deletion, EventID folder) {
        return deletion > folder ? static_cast<std::uint32_t>(raw(deletion) - raw(folder)) : 0;
    }
};

}  // namespace marrowdale
