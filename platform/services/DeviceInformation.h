#pragma once

#include <optional>
#include <string_view>

#include "platform/foundation/ResourceValue.h"

namespace marrowdale {

// Facts about the device that the provider runs on. Any thread.
class DeviceInformation {
  public:
    virtual ~DeviceInformation() = default;

    // "DeviceClassNumber": an integer, 3 for a device with a large screen. "main-screen-scale":
    // pixels a point of the main screen, a real number. None for another key.
    [[nodiscard]] virtual std::optional<Number> valueForKey(std::string_view key) = 0;
};

}  // namespace marrowdale
