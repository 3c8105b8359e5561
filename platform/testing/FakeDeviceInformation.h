#pragma once

#include <atomic>
#include <optional>
#include <string_view>

#include "platform/services/DeviceInformation.h"

namespace marrowdale {

// The device that a test describes. Any thread; described between calls.
class FakeDeviceInformation : public DeviceInformation {
  public:
    std::optional<Number> deviceClass = Number(std::int64_t{1});
    std::optional<Number> scale = Number(2.0);
    std::atomic<int> deviceClassReads = 0;
    std::atomic<int> scaleReads = 0;

    std::optional<Number> valueForKey(std::string_view key) override {
        if (key == "DeviceClassNumber") {
            ++deviceClassReads;
            return deviceClass;
        }
        if (key == "main-screen-scale") {
            ++scaleReads;
            return scale;
        }
        return std::nullopt;
    }
};

}  // namespace marrowdale
