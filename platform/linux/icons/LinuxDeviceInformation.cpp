#include "platform/linux/icons/LinuxDeviceInformation.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr double largestScale = 3;
constexpr double cursorSizeAtScaleOne = 24;
constexpr std::int64_t largeScreen = 3;

}  // namespace

LinuxDeviceInformation::LinuxDeviceInformation(Variable variable)
    : variable_(std::move(variable)) {}

std::optional<Number> LinuxDeviceInformation::valueForKey(std::string_view key) {
    if (key == "main-screen-scale") {
        return Number(screenScale());
    }
    if (key == "DeviceClassNumber") {
        return Number(deviceClass());
    }
    return std::nullopt;
}

std::optional<double> LinuxDeviceInformation::number(std::string_view name) const {
    const auto text = variable_(name);
    if (!text) {
        return std::nullopt;
    }
    double value = 0;
    const char* const end = text->data() + text->size();
    const auto read = std::from_chars(text->data(), end, value);
    const bool isNumber = read.ec == std::errc() && read.ptr == end && std::isfinite(value);
    return isNumber && value > 0 ? std::optional(value) : std::nullopt;
}

double LinuxDeviceInformation::screenScale() const {
    double scale = 1;
    if (const auto told = number("MARROWDALE_SCREEN_SCALE")) {
        scale = *told;
    } else {
        scale =
            std::max({scale, number("GDK_SCALE").value_or(1), number("QT_SCALE_FACTOR").value_or(1),
                      number("XCURSOR_SIZE").value_or(1) / cursorSizeAtScaleOne});
    }
    return std::clamp(std::ceil(scale), 1.0, largestScale);
}

std::int64_t LinuxDeviceInformation::deviceClass() const {
    const auto told = number("MARROWDALE_DEVICE_CLASS");
    return told && *told < 1000 ? static_cast<std::int64_t>(*told) : largeScreen;
}

}  // namespace marrowdale::native
