#include <gtest/gtest.h>

#include "host/daemon/Mounts.h"

namespace marrowdale::host {
namespace {

constexpr std::string_view table =
    "21 1 8:1 / / rw,relatime shared:1 - ext4 /dev/sda1 rw\n"
    "22 21 0:20 / /home rw - btrfs /dev/sdb ro,subvol=/\n"
    "23 22 0:21 / /home/u/with\\040space rw,nosuid shared:2 master:1 - xfs /dev/sdc rw\n"
    "24 21 0:22 / /tmp rw - tmpfs tmpfs rw\n"
    "25 24 0:23 / /tmp ro - ext4 /dev/sdd rw\n"
    "broken line\n";

TEST(MountsTest, theDeepestMountThatHoldsThePathIsTheOne) {
    EXPECT_EQ(mountOf("/etc", table)->type, "ext4");
    EXPECT_EQ(mountOf("/home/u", table)->type, "btrfs");
    EXPECT_EQ(mountOf("/home/u/with space/x", table)->source, "/dev/sdc");
    EXPECT_EQ(mountOf("/home/u/with space", table)->point, "/home/u/with space");
    EXPECT_EQ(mountOf("/homely", table)->point, "/");
}

TEST(MountsTest, aMountThatCoversAnotherIsTheOne) {
    EXPECT_EQ(mountOf("/tmp/x", table)->source, "/dev/sdd");
}

TEST(MountsTest, readOnlyMountsAndReadOnlyFileSystemsAreReadOnly) {
    EXPECT_TRUE(mountOf("/tmp", table)->isReadOnly);
    EXPECT_TRUE(mountOf("/home", table)->isReadOnly);
    EXPECT_FALSE(mountOf("/", table)->isReadOnly);
}

TEST(MountsTest, whatIsMountedBelowAFolderIsToldOnceAndFromOutside) {
    using Points = std::vector<std::string>;
    EXPECT_EQ(mountsBelow("/", table), (Points{"/home", "/tmp"}));
    EXPECT_EQ(mountsBelow("/home", table), (Points{"/home/u/with space"}));
    EXPECT_EQ(mountsBelow("/home/u/with space", table), Points());
    EXPECT_EQ(mountsBelow("/hom", table), Points());
    EXPECT_EQ(mountsBelow("/",
                          "1 0 8:1 / /a rw - x x rw\n2 0 8:1 / /a b rw - x x rw\n"
                          "3 0 8:1 / /a-b rw - x x rw\n4 0 8:1 / /a/b rw - x x rw\n"),
              (Points{"/a", "/a-b"}));
}

TEST(MountsTest, anEmptyTableHoldsNothing) {
    EXPECT_EQ(mountOf("/", ""), std::nullopt);
}

TEST(MountsTest, theKernelsOwnTableKnowsTheRoot) {
    ASSERT_TRUE(mountOf("/").has_value());
    EXPECT_FALSE(mountOf("/")->type.empty());
}

}  // namespace
}  // namespace marrowdale::host
