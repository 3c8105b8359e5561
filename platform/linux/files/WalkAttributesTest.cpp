#include <cstdint>
#include <filesystem>
#include <optional>
#include <sys/stat.h>
#include <system_error>

#include "platform/linux/files/WalkTest.h"

namespace marrowdale::native {
namespace {

class WalkAttributesTest : public WalkTest {};
INSTANTIATE_TEST_SUITE_P(OnEach, WalkAttributesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(WalkAttributesTest, accessFollowsModeForThoseItBinds) {
    file("locked");
    ASSERT_EQ(::chmod(world_.at("locked").c_str(), 0400), 0);
    const bool root = runsAsRoot();
    EXPECT_EQ(listed("locked").prefetched()->isWritable, root);
    EXPECT_TRUE(listed("locked").prefetched()->isReadable);
}

TEST_P(WalkAttributesTest, attributesComeAlong) {
    if (!keepsUserAttributes(world_.folder.path())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    file("none");
    file("both");
    folder("sub");
    setAttribute(world_.at("both"), "user.one", "1");
    setAttribute(world_.at("both"), "user.two", std::string("\0\xff\n", 3));
    setAttribute(world_.at("both"), "user.three", "not asked for");
    setAttribute(world_.at("sub"), "user.two", "");
    const auto value = [](const URL& url, const char* name) {
        const auto found = *url.prefetched()->attributes->value(name);
        return found ? std::optional(found->text()) : std::nullopt;
    };
    for (int round = 0; round < 3; ++round) {
        const URL both = listed("both");
        EXPECT_EQ(value(both, "one"), "1");
        EXPECT_EQ(value(both, "two"), std::string("\0\xff\n", 3));
        EXPECT_FALSE(both.prefetched()->attributes->covers("three"));
        EXPECT_TRUE(listed("none").prefetched()->attributes->empty());
        EXPECT_EQ(value(listed("sub"), "two"), "");
        EXPECT_EQ(value(listed("sub"), "one"), std::nullopt);
    }
    setAttribute(world_.at("both"), "user.one", "2");
    EXPECT_EQ(value(listed("both"), "one"), "2");
}

TEST_P(WalkAttributesTest, unchangedFilesShareTheirAttributes) {
    if (!keepsUserAttributes(world_.folder.path())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    file("a");
    setAttribute(world_.at("a"), "user.one", "1");
    // Once its change time is old enough to be sure of, the same set is handed out.
    ASSERT_TRUE(waitUntil([&] {
        return listed("a").prefetched()->attributes == listed("a").prefetched()->attributes;
    }));
    const auto before = listed("a").prefetched()->attributes;
    setAttribute(world_.at("a"), "user.one", "2");
    EXPECT_EQ((*listed("a").prefetched()->attributes->value("one"))->text(), "2");
    EXPECT_EQ((*before->value("one"))->text(), "1");
}

TEST_P(WalkAttributesTest, largestAttributesComeWhole) {
    if (!keepsUserAttributes(world_.folder.path())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    file("a");
    std::string written;
    for (std::size_t size = 65536; size >= 512 && written.empty(); size /= 2) {
        std::string bytes(size, '\0');
        std::uint32_t state = 12345;
        for (char& byte : bytes) {
            state = state * 1664525U + 1013904223U;
            byte = static_cast<char>(state >> 24U);
        }
        try {
            setAttribute(world_.at("a"), "user.one", bytes);
            written = bytes;
        } catch (const std::system_error&) {
            continue;
        }
    }
    ASSERT_FALSE(written.empty());
    EXPECT_TRUE((*listed("a").prefetched()->attributes->value("one"))->text() == written);
}

}  // namespace
}  // namespace marrowdale::native
