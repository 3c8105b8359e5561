#include <cerrno>
#include <filesystem>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/cli/ThumbnailFile.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

namespace fs = std::filesystem;

class ThumbnailFileTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::size_t files() const {
        std::size_t count = 0;
        for ([[maybe_unused]] const auto& entry : fs::directory_iterator(folder_.path())) {
            ++count;
        }
        return count;
    }
    TemporaryDirectory folder_;
};

TEST_F(ThumbnailFileTest, aNameIsTheIdentifierAndNeverAPath) {
    EXPECT_EQ(thumbnailFileName("#org.example.Notes"), "#org.example.Notes.png");
    EXPECT_EQ(thumbnailFileName("did=12"), "did=12.png");
    EXPECT_EQ(thumbnailFileName("#../../etc/x"), "#..%2F..%2Fetc%2Fx.png");
    EXPECT_EQ(thumbnailFileName("#a%2Fb"), "#a%252Fb.png");
    EXPECT_EQ(thumbnailFileName("#a\nb\x7F"), "#a%0Ab%7F.png");
    EXPECT_EQ(thumbnailFileName("#\xFF\xC3\xA4"), "#\xFF\xC3\xA4.png");
}

TEST_F(ThumbnailFileTest, whatHasTheNameIsReplaced) {
    for (const char* text : {"one", "other"}) {
        const auto path = writeThumbnail(folder_.path(), "#a", Data::fromText(text));
        ASSERT_TRUE(path.has_value());
        EXPECT_EQ(*path, folder_.path("#a.png"));
        EXPECT_EQ(readFile(*path), text);
    }
    EXPECT_EQ(files(), 1U);
}

TEST_F(ThumbnailFileTest, aLinkIsReplacedAndNotFollowed) {
    writeFile(folder_.path("victim"), "kept");
    fs::create_symlink("victim", folder_.path("#a.png"));
    ASSERT_TRUE(writeThumbnail(folder_.path(), "#a", Data::fromText("new")).has_value());
    EXPECT_EQ(readFile(folder_.path("victim")), "kept");
    EXPECT_FALSE(fs::is_symlink(folder_.path("#a.png")));
}

TEST_F(ThumbnailFileTest, aMissingFolderIsMade) {
    const auto path = writeThumbnail(folder_.path("deep/er"), "#a", Data::fromText("x"));
    ASSERT_TRUE(path.has_value());
    EXPECT_EQ(*path, folder_.path("deep/er/#a.png"));
}

TEST_F(ThumbnailFileTest, whatCantBeWrittenIsToldAndLeavesNothing) {
    makeFolder(folder_.path("#a.png/in the way"));
    const auto taken = writeThumbnail(folder_.path(), "#a", Data::fromText("x"));
    ASSERT_FALSE(taken.has_value());
    EXPECT_EQ(taken.error().code, EISDIR);
    EXPECT_EQ(files(), 1U);
    writeFile(folder_.path("file"), "");
    const auto none = writeThumbnail(folder_.path("file"), "#a", Data::fromText("x"));
    ASSERT_FALSE(none.has_value());
    EXPECT_EQ(none.error().domain, ErrorDomain::posix);
    const auto longName =
        writeThumbnail(folder_.path(), "#" + std::string(300, 'a'), Data::fromText("x"));
    ASSERT_FALSE(longName.has_value());
    EXPECT_EQ(longName.error().code, ENAMETOOLONG);
    EXPECT_EQ(files(), 2U);
}

}  // namespace
}  // namespace marrowdale::host
