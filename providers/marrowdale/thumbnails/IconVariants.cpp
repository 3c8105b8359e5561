#include "providers/marrowdale/thumbnails/IconVariants.h"

#include <memory>
#include <variant>

namespace marrowdale {

namespace {

constexpr std::int64_t largeDeviceClass = 3;

std::int64_t integerValue(const std::optional<Number>& number) {
    return number ? std::visit([](auto value) { return static_cast<std::int64_t>(value); }, *number)
                  : 0;
}

// Screens are told to single precision.
double singlePrecisionValue(const std::optional<Number>& number) {
    return number ? std::visit(
                        [](auto value) { return static_cast<double>(static_cast<float>(value)); },
                        *number)
                  : 0;
}

struct DeviceClass {
    bool isLarge = false;
};
struct Screen {
    double scale = 0;
};

bool isLargeDevice(const Platform& platform) {
    const auto read = [&] {
        return std::make_shared<DeviceClass>(integerValue(platform.deviceInformation.valueForKey(
                                                 "DeviceClassNumber")) == largeDeviceClass);
    };
    return platform.shared.get<DeviceClass>("marrowdale.device-class", read).isLarge;
}

double screenScale(const Platform& platform) {
    const auto read = [&] {
        return std::make_shared<Screen>(
            singlePrecisionValue(platform.deviceInformation.valueForKey("main-screen-scale")));
    };
    return platform.shared.get<Screen>("marrowdale.screen-scale", read).scale;
}

}  // namespace

int iconVariant(double screenScale, bool isLargeDevice) {
    if (screenScale == 3.0) {
        return 32;
    }
    if (screenScale == 2.0) {
        return isLargeDevice ? 24 : 15;
    }
    return isLargeDevice ? 1 : 0;
}

std::optional<Data> bestIconData(const Platform& platform, const BundleRecord& record) {
    double scale = screenScale(platform);
    while (scale >= 1.0) {
        if (auto data = record.iconDataForVariant(iconVariant(scale, isLargeDevice(platform)))) {
            return data;
        }
        if (scale > 1.0) {
            scale -= 1.0;
        }
    }
    return std::nullopt;
}

}  // namespace marrowdale
