#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "platform/services/DeviceInformation.h"

namespace marrowdale::native {

// Facts about the screen, from what desktops and toolkits put into the environment of a session.
//
// "main-screen-scale" is MARROWDALE_SCREEN_SCALE, else the largest of GDK_SCALE, QT_SCALE_FACTOR
// and XCURSOR_SIZE / 24 (what sessions without the others still set), rounded up to a whole number,
// for icons are made for whole scales; 1 where nothing says more. It is 1 to 3.
// "DeviceClassNumber" is MARROWDALE_DEVICE_CLASS, else 3: a desktop's screen is a large one.
//
// What the variables say is read when it is asked for. Any thread, as far as `variable` is.
class LinuxDeviceInformation final : public DeviceInformation {
  public:
    // The value of an environment variable; none when it is unset or empty.
    using Variable = std::function<std::optional<std::string>(std::string_view name)>;
    explicit LinuxDeviceInformation(Variable variable);

    std::optional<Number> valueForKey(std::string_view key) override;

  private:
    [[nodiscard]] std::optional<double> number(std::string_view name) const;
    [[nodiscard]] double screenScale() const;
    [[nodiscard]] std::int64_t deviceClass() const;

    Variable variable_;
};

}  // namespace marrowdale::native
