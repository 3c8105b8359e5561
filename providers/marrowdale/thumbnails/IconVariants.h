#pragma once

#include <optional>

#include "platform/Platform.h"

namespace marrowdale {

// The number by which bundle records know the size of icon for a screen of that scale, which is 1.0
// or more. `isLargeDevice`: the device is of the class of large screens.
[[nodiscard]] int iconVariant(double screenScale, bool isLargeDevice);

// The icon that suits this device's screen best: of the variants for its scale, and for each whole
// step below it down to 1.0, the first for which the record has one. At 1.0 the record is asked
// again until it has one, as registries always do; a scale below 1.0 has none. What the device is
// like is asked once in a world.
[[nodiscard]] std::optional<Data> bestIconData(const Platform& platform,
                                               const BundleRecord& record);

}  // namespace marrowdale
