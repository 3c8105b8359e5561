#include <array>

#include <gtest/gtest.h>

#include "platform/linux/files/PackageTypes.h"

namespace marrowdale::native {
namespace {

TEST(PackageTypesTest, shippedExtensionsOfEitherCase) {
    const PackageTypes packages;
    for (const char* name : {"a.bundle", "a.Package", "a.b.TEXTBUNDLE", "font.ufo", "x.AppDir"}) {
        EXPECT_TRUE(packages.isPackageName(name)) << name;
    }
    for (const char* name : {"bundle", ".bundle", "a.bundles", "a.bundle.d", "a.", "", "a.bund"}) {
        EXPECT_FALSE(packages.isPackageName(name)) << name;
    }
}

TEST(PackageTypesTest, declaredOnesJoinThem) {
    const std::array<std::string, 3> declared{"Sketchbook", "bundle", ""};
    const PackageTypes packages(declared);
    EXPECT_TRUE(packages.isPackageName("a.sketchBOOK"));
    EXPECT_TRUE(packages.isPackageName("a.ufo"));
    EXPECT_FALSE(packages.isPackageName("a."));
    EXPECT_EQ(packages.extensions().size(), PackageTypes::shipped().size() + 1);
}

}  // namespace
}  // namespace marrowdale::native
