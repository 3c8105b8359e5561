#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/files/AttributeReader.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/LinuxFilesTestWorld.h"

namespace marrowdale::native {
namespace {

struct AttributeReaderTest : OnEachFileSystem {
    void SetUp() override {
        if (!keepsUserAttributes(world_.folder.path())) {
            MARROWDALE_SKIP("the file system keeps no user attributes");
        }
    }
    // By both methods, which must agree; the folder's own path is never used.
    AttributeReader::Answer read(const AttributeReader& reader, const char* name) {
        auto folder = openFolder(world_.folder.path());
        AttributeReader::Answer relative = readBy(world_.calls, *folder, reader, name);
        AttributeReader::Answer entering = readBy(worker_, *folder, reader, name);
        EXPECT_EQ(relative.complete, entering.complete);
        EXPECT_EQ(relative.found.set == nullptr, entering.found.set == nullptr);
        return entering;
    }
    static AttributeReader::Answer readBy(AttributeCalls& calls, const UniqueFD& folder,
                                          const AttributeReader& reader, const char* name) {
        AttributeReader::Answer answer;
        calls.inFolder(folder.get(), [&](const AttributeCalls::InFolder& entered) {
            answer = reader.read(entered, name);
        });
        return answer;
    }
    AttributeCalls worker_{AttributeCalls::Method::worker};
};
INSTANTIATE_TEST_SUITE_P(OnEach, AttributeReaderTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(AttributeReaderTest, readsThoseAskedFor) {
    writeFile(world_.at("file"), "");
    setAttribute(world_.at("file"), "user.one", "1");
    setAttribute(world_.at("file"), "user.empty", "");
    setAttribute(world_.at("file"), "user.other", "x");
    const AttributeReader reader({"one", "empty", "missing", "", std::string("o\0e", 3)});
    const auto answer = read(reader, "file");
    ASSERT_TRUE(answer.complete);
    ASSERT_TRUE(answer.found.set);
    EXPECT_EQ((*answer.found.set->value("one"))->text(), "1");
    EXPECT_EQ((*answer.found.set->value("empty"))->text(), "");
    EXPECT_FALSE(*answer.found.set->value("missing"));
    EXPECT_FALSE(answer.found.set->covers("other"));
}

TEST_P(AttributeReaderTest, nothingThereIsNoSet) {
    writeFile(world_.at("file"), "");
    const AttributeReader reader({"one"});
    const auto answer = read(reader, "file");
    EXPECT_TRUE(answer.complete);
    EXPECT_FALSE(answer.found.set);
    EXPECT_TRUE(reader.emptySet()->covers("one"));
    EXPECT_FALSE(AttributeReader({}).emptySet());
}

TEST_P(AttributeReaderTest, manyNamesFillMoreThanTheFirstRoom) {
    writeFile(world_.at("file"), "");
    for (int i = 0; i < 60; ++i) {
        setAttribute(world_.at("file"), "user.a rather long name " + std::to_string(i), "");
    }
    const AttributeReader reader({"a rather long name 59", "a rather long name 0"});
    const auto answer = read(reader, "file");
    ASSERT_TRUE(answer.found.set);
    EXPECT_TRUE(*answer.found.set->value("a rather long name 0"));
    EXPECT_TRUE(*answer.found.set->value("a rather long name 59"));
}

TEST_P(AttributeReaderTest, aLinkIsNotFollowed) {
    writeFile(world_.at("file"), "");
    setAttribute(world_.at("file"), "user.one", "1");
    std::filesystem::create_symlink("file", world_.at("link"));
    EXPECT_FALSE(read(AttributeReader({"one"}), "link").found.set);
}

TEST_P(AttributeReaderTest, whatCannotBeListedIsAnErrorOfEachName) {
    const auto answer = read(AttributeReader({"one"}), "gone");
    EXPECT_FALSE(answer.complete);
    ASSERT_TRUE(answer.found.set);
    EXPECT_EQ(answer.found.set->value("one").error().code, ENOENT);
}

TEST_P(AttributeReaderTest, workerLeavesTheProcessWhereItIs) {
    const auto before = std::filesystem::current_path();
    writeFile(world_.at("file"), "");
    (void)read(AttributeReader({"one"}), "file");
    EXPECT_EQ(std::filesystem::current_path(), before);
}

TEST_P(AttributeReaderTest, folderThatCannotBeEnteredIsAnError) {
    writeFile(world_.at("file"), "");
    const UniqueFD file(::open(world_.at("file").c_str(), O_RDONLY | O_CLOEXEC));
    const auto answer = readBy(worker_, file, AttributeReader({"one"}), "file");
    EXPECT_EQ(answer.found.set->value("one").error().code, ENOTDIR);
}

}  // namespace
}  // namespace marrowdale::native
