#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/files/LinuxExtendedAttributes.h"
#include "platform/linux/files/LinuxFilesTestWorld.h"

namespace marrowdale::native {
namespace {

struct LinuxExtendedAttributesTest : OnEachFileSystem {
    void SetUp() override {
        if (!keepsUserAttributes(world_.folder.path())) {
            MARROWDALE_SKIP("the file system keeps no user attributes");
        }
        writeFile(world_.at("file"), "");
    }
    std::unique_ptr<OpenFile> open(const char* name) {
        auto file = world_.writeAccess.openForWriting(world_.url(name));
        EXPECT_TRUE(file) << file.error().description();
        return std::move(*file);
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, LinuxExtendedAttributesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LinuxExtendedAttributesTest, setsReadsReplacesAndRemoves) {
    const auto file = open("file");
    const URL url = world_.url("file");
    const Data value(Bytes{0, 255, 10, 0});
    ASSERT_TRUE(world_.attributes.set(*file, "name#PS", value));
    EXPECT_EQ(attribute(world_.at("file"), "user.name#PS"), std::string("\0\xff\n\0", 4));
    EXPECT_EQ(*world_.attributes.size(url, "name#PS"), 4U);
    EXPECT_EQ(*world_.attributes.read(url, "name#PS", 4), value);
    EXPECT_EQ(*world_.attributes.read(url, "name#PS", 100), value);
    ASSERT_TRUE(world_.attributes.set(*file, "name#PS", Data()));
    EXPECT_EQ(*world_.attributes.size(url, "name#PS"), 0U);
    EXPECT_TRUE(world_.attributes.read(url, "name#PS", 0)->empty());
    ASSERT_TRUE(world_.attributes.remove(*file, "name#PS"));
    EXPECT_EQ(world_.attributes.remove(*file, "name#PS").error().code, ENODATA);
    EXPECT_EQ(world_.attributes.size(url, "name#PS").error().code, ENODATA);
    EXPECT_EQ(world_.attributes.read(url, "name#PS", 10).error().code, ENODATA);
}

TEST_P(LinuxExtendedAttributesTest, valueThatGrewSinceItsSizeWasAskedIsERANGE) {
    const URL url = world_.url("file");
    setAttribute(url.path(), "user.a", "12345");
    EXPECT_EQ(world_.attributes.read(url, "a", 4).error().code, ERANGE);
    EXPECT_EQ(world_.attributes.read(url, "a", 0).error().code, ERANGE);
    EXPECT_EQ(world_.attributes.read(url, "a", 5)->text(), "12345");
}

TEST_P(LinuxExtendedAttributesTest, foldersCarryThemToo) {
    makeFolder(world_.at("folder"));
    ASSERT_TRUE(world_.attributes.set(*open("folder"), "a", Data::fromText("x")));
    EXPECT_EQ(world_.attributes.read(world_.url("folder"), "a", 1)->text(), "x");
}

TEST_P(LinuxExtendedAttributesTest, aLinksOwnAttributesAreReadNotItsTargets) {
    setAttribute(world_.at("file"), "user.a", "x");
    std::filesystem::create_symlink("file", world_.at("link"));
    EXPECT_EQ(world_.attributes.size(world_.url("link"), "a").error().code, ENODATA);
}

TEST_P(LinuxExtendedAttributesTest, errorsNameThePath) {
    EXPECT_EQ(world_.attributes.size(world_.url("none"), "a").error().code, ENOENT);
    EXPECT_EQ(world_.attributes.size(world_.url("none"), "a").error().subject, world_.at("none"));
    for (const std::string& name : {std::string(), std::string("a\0b", 3)}) {
        EXPECT_EQ(world_.attributes.size(world_.url("file"), name).error().code, EINVAL);
        EXPECT_EQ(world_.attributes.set(*open("file"), name, Data()).error().code, EINVAL);
        EXPECT_EQ(world_.attributes.remove(*open("file"), name).error().code, EINVAL);
    }
    const auto tooLarge = world_.attributes.set(*open("file"), "a", Data(Bytes(65537)));
    EXPECT_FALSE(tooLarge);
}

TEST_P(LinuxExtendedAttributesTest, listedURLsAnswerFromTheListing) {
    setAttribute(world_.at("file"), "user.a", "x");
    DirectoryEnumerationRequest request{.url = world_.url(),
                                        .keys = {},
                                        .attributeNames = {"a", "b"},
                                        .options = {},
                                        .position = {},
                                        .errorHandler = {}};
    std::vector<URL> urls;
    ASSERT_TRUE((*world_.files.enumerateDirectory(request))->next(10, urls));
    ASSERT_EQ(urls.size(), 1U);
    setAttribute(world_.at("file"), "user.a", "changed");
    setAttribute(world_.at("file"), "user.b", "new");
    setAttribute(world_.at("file"), "user.c", "not asked for");
    EXPECT_EQ(*world_.attributes.size(urls[0], "a"), 1U);
    EXPECT_EQ(world_.attributes.read(urls[0], "a", 1)->text(), "x");
    EXPECT_EQ(world_.attributes.read(urls[0], "a", 0).error().code, ERANGE);
    EXPECT_EQ(world_.attributes.size(urls[0], "b").error().code, ENODATA);
    EXPECT_EQ(*world_.attributes.size(urls[0], "c"), 13U);
    EXPECT_EQ(world_.attributes.read(urls[0].withoutCachedValues(), "a", 10)->text(), "changed");
}

}  // namespace
}  // namespace marrowdale::native
