#include <map>

#include <gtest/gtest.h>

#include "platform/linux/icons/LinuxDeviceInformation.h"

namespace marrowdale::native {
namespace {

using Variables = std::map<std::string, std::string, std::less<>>;

LinuxDeviceInformation device(Variables variables) {
    return LinuxDeviceInformation(
        [variables = std::move(variables)](std::string_view name) -> std::optional<std::string> {
            const auto found = variables.find(name);
            return found == variables.end() ? std::nullopt : std::optional(found->second);
        });
}

double scale(Variables variables) {
    return std::get<double>(*device(std::move(variables)).valueForKey("main-screen-scale"));
}

std::int64_t deviceClass(Variables variables) {
    return std::get<std::int64_t>(*device(std::move(variables)).valueForKey("DeviceClassNumber"));
}

TEST(LinuxDeviceInformationTest, theScaleIsWhatTheSessionSays) {
    EXPECT_EQ(scale({}), 1);
    EXPECT_EQ(scale({{"GDK_SCALE", "2"}}), 2);
    EXPECT_EQ(scale({{"QT_SCALE_FACTOR", "1.25"}}), 2);
    EXPECT_EQ(scale({{"XCURSOR_SIZE", "24"}}), 1);
    EXPECT_EQ(scale({{"XCURSOR_SIZE", "48"}}), 2);
    EXPECT_EQ(scale({{"GDK_SCALE", "1"}, {"QT_SCALE_FACTOR", "3"}}), 3);
    EXPECT_EQ(scale({{"MARROWDALE_SCREEN_SCALE", "1"}, {"GDK_SCALE", "3"}}), 1);
}

TEST(LinuxDeviceInformationTest, theScaleIsOneToThreeWhateverIsSaid) {
    EXPECT_EQ(scale({{"GDK_SCALE", "17"}}), 3);
    for (const char* text : {"0", "-2", "nan", "inf", "two", "2x", " 2", "0.5", "1e999"}) {
        EXPECT_EQ(scale({{"GDK_SCALE", text}}), 1) << text;
    }
}

TEST(LinuxDeviceInformationTest, aDesktopIsOfTheClassOfLargeScreens) {
    EXPECT_EQ(deviceClass({}), 3);
    EXPECT_EQ(deviceClass({{"MARROWDALE_DEVICE_CLASS", "1"}}), 1);
    EXPECT_EQ(deviceClass({{"MARROWDALE_DEVICE_CLASS", "phone"}}), 3);
}

TEST(LinuxDeviceInformationTest, nothingElseIsKnown) {
    EXPECT_EQ(device({}).valueForKey("main-screen-width"), std::nullopt);
}

}  // namespace
}  // namespace marrowdale::native
