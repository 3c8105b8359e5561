#pragma once

#include <cstdint>
#include <optional>

#include "platform/foundation/Data.h"

namespace marrowdale::host {

// The one thing in a provider's anchors that its host must see: a dictionary with this key, whose
// number is the version of the app libraries that the anchor's holder was told of. 0: of none.
inline constexpr const char* anchorLibraryVersionKey = "appLibraryVersionToken";

// None for bytes that are no such anchor.
[[nodiscard]] std::optional<std::uint64_t> libraryVersionIn(const Data& anchor);

// The same anchor for somebody who was told of no libraries; other bytes stay as they are.
[[nodiscard]] Data withoutLibraryVersion(const Data& anchor);

}  // namespace marrowdale::host
