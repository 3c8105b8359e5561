#pragma once

#include <cstdint>
#include <optional>

#include "platform/foundation/Data.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale::host {

// What a host must see in a provider's anchors, which are dictionaries: the version of the app
// libraries that the anchor's holder was told of (0: of none), the event from which on he is to be
// told, and how far he was told of what that event brings.
inline constexpr const char* anchorLibraryVersionKey = "appLibraryVersionToken";
inline constexpr const char* anchorEventKey = "streamEventID";
inline constexpr const char* anchorOffsetKey = "offset";

// None for bytes that are no such anchor.
[[nodiscard]] std::optional<std::uint64_t> libraryVersionIn(const Data& anchor);

// None for bytes that are no such anchor.
[[nodiscard]] std::optional<EventID> eventIn(const Data& anchor);

// The same anchor of an earlier event; other bytes stay as they are.
[[nodiscard]] Data withEvent(const Data& anchor, EventID event);

// The same anchor for somebody who was told of no libraries; other bytes stay as they are.
[[nodiscard]] Data withoutLibraryVersion(const Data& anchor);

}  // namespace marrowdale::host
