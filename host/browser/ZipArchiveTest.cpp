#include <array>
#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/browser/ZipArchive.h"
#include "host/testing/FakeExtension.h"
#include "platform/linux/files/UniqueFD.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::host {
namespace {

using Json = nlohmann::json;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

// What an independent reader finds in an archive: of each entry its name, size, mode, time and,
// where it is small, its content; "bad" is the first entry whose checksum is wrong, or null.
constexpr const char* reader = R"(
import json, sys, zipfile
archive = zipfile.ZipFile(sys.argv[1])
check = len(sys.argv) < 3
print(json.dumps({"bad": archive.testzip() if check else None, "entries": [
    {"name": each.filename, "size": each.file_size, "mode": each.external_attr >> 16,
     "offset": each.header_offset, "minute": each.date_time[4],
     "content": archive.read(each).decode("latin-1") if check else None}
    for each in archive.infolist()]}))
)";

Json readBack(const std::string& archive, const std::string& more = "") {
    const std::string script = archive + ".py";
    writeFile(script, reader);
    const std::string command = "python3 '" + script + "' '" + archive + "' " + more;
    const std::unique_ptr<FILE, int (*)(FILE*)> output(::popen(command.c_str(), "r"), &::pclose);
    std::string text;
    std::array<char, 4096> buffer{};
    while (const std::size_t count = std::fread(buffer.data(), 1, buffer.size(), output.get())) {
        text.append(buffer.data(), count);
    }
    return Json::parse(text, nullptr, false);
}

class ZipArchiveTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::string path(std::string_view name) const { return folder_.path(name); }

    [[nodiscard]] FileProviderItemPtr item(const std::string& name) const {
        auto made = std::make_shared<FakeItem>("", path(name));
        struct stat status{};
        EXPECT_EQ(::lstat(path(name).c_str(), &status), 0) << name;
        made->filename = name.substr(name.rfind('/') + 1);
        made->fileID = status.st_ino;
        return made;
    }

    // In pieces of that size.
    [[nodiscard]] static Expected<std::string> bytesOf(std::vector<FileProviderItemPtr> items,
                                                       std::size_t pieceSize = 4096) {
        ZipArchive archive(std::move(items));
        std::string all;
        std::string piece(pieceSize, '\0');
        while (true) {
            const auto count = archive.read(piece);
            if (!count) {
                return Unexpected(count.error());
            }
            if (*count == 0) {
                return all;
            }
            all.append(piece, 0, *count);
        }
    }

    [[nodiscard]] Json contents(std::vector<FileProviderItemPtr> items,
                                std::size_t pieceSize = 4096) const {
        const auto all = bytesOf(std::move(items), pieceSize);
        EXPECT_TRUE(all.has_value());
        writeFile(archivePath_, all.value_or(""));
        const Json found = readBack(archivePath_);
        EXPECT_TRUE(found.is_object());
        EXPECT_TRUE(found["bad"].is_null()) << found;
        return found["entries"];
    }

    [[nodiscard]] static std::vector<std::string> names(const Json& entries) {
        std::vector<std::string> all;
        for (const Json& entry : entries) {
            all.push_back(entry["name"]);
        }
        return all;
    }

    TemporaryDirectory folder_;
    TemporaryDirectory elsewhere_;
    const std::string archivePath_ = elsewhere_.path("made.zip");
};

TEST_F(ZipArchiveTest, foldersAndFilesAreInIt) {
    std::filesystem::create_directories(path("Garden/Deep/Empty"));
    writeFile(path("Garden/plan.txt"), "plan");
    writeFile(path("Garden/Deep/photo"), std::string(100'000, 'p'));
    writeFile(path("Garden/empty"), "");
    writeFile(path("alone.txt"), "alone");
    for (const std::size_t pieceSize : {1U, 7U, 65536U}) {
        const Json entries = contents({item("Garden"), item("alone.txt")}, pieceSize);
        EXPECT_THAT(names(entries), ElementsAre("Garden/", "Garden/Deep/", "Garden/Deep/Empty/",
                                                "Garden/Deep/photo", "Garden/empty",
                                                "Garden/plan.txt", "alone.txt"));
        EXPECT_EQ(entries[3]["content"], std::string(100'000, 'p'));
        EXPECT_EQ(entries[5]["content"], "plan");
        EXPECT_TRUE(S_ISDIR(entries[0]["mode"].get<mode_t>()));
        EXPECT_TRUE(S_ISREG(entries[5]["mode"].get<mode_t>()));
    }
}

TEST_F(ZipArchiveTest, nothingIsAnArchiveToo) {
    EXPECT_THAT(names(contents({})), ElementsAre());
}

TEST_F(ZipArchiveTest, linksAndWhatIsNoFileAreLeftOut) {
    writeFile(elsewhere_.path("secret"), "secret");
    std::filesystem::create_directories(elsewhere_.path("inside"));
    writeFile(elsewhere_.path("inside/too"), "secret");
    std::filesystem::create_directories(path("In/.Trash"));
    writeFile(path("In/.Trash/old"), "old");
    writeFile(path("In/a"), "a");
    std::filesystem::create_symlink(elsewhere_.path("secret"), path("In/link"));
    std::filesystem::create_symlink(elsewhere_.path("inside"), path("In/folder link"));
    ASSERT_EQ(::mkfifo(path("In/pipe").c_str(), S_IRUSR | S_IWUSR), 0);
    EXPECT_THAT(names(contents({item("In"), item("In/link"), item("In/pipe")})),
                ElementsAre("In/", "In/a"));
}

TEST_F(ZipArchiveTest, namesAreTextThatLeadsNowhereElse) {
    std::filesystem::create_directories(path("In"));
    for (const char* name :
         {"..\\..\\up", "line\nbreak", "turned \xE2\x80\xAEgnp", "bytes \xFF", "plain \xC3\xA4"}) {
        writeFile(path("In/" + std::string(name)), "x");
    }
    EXPECT_THAT(names(contents({item("In")})),
                ElementsAre("In/", "In/.._.._up", "In/bytes _", "In/line_break",
                            "In/plain \xC3\xA4", "In/turned _gnp"));
    EXPECT_EQ(zipNamePart("."), "_");
    EXPECT_EQ(zipNamePart(".."), "_");
}

TEST_F(ZipArchiveTest, aTakenNameGetsANumber) {
    std::filesystem::create_directories(path("one"));
    std::filesystem::create_directories(path("two"));
    writeFile(path("one/a.txt"), "1");
    writeFile(path("two/a.txt"), "2");
    writeFile(path("one/x\x01"), "3");
    writeFile(path("one/x\x02"), "4");
    const Json top = contents({item("one/a.txt"), item("two/a.txt")});
    EXPECT_THAT(names(top), ElementsAre("a.txt", "a 2.txt"));
    EXPECT_EQ(top[1]["content"], "2");
    EXPECT_THAT(names(contents({item("one")})),
                ElementsAre("one/", "one/a.txt", "one/x_", "one/x_ 2"));
}

TEST_F(ZipArchiveTest, whatIsGoneOrAnotherByNowIsLeftOut) {
    writeFile(path("gone"), "gone");
    writeFile(path("other"), "old");
    const auto items = std::vector{item("gone"), item("other")};
    std::filesystem::remove(path("gone"));
    writeFile(path("new"), "new");
    std::filesystem::rename(path("new"), path("other"));
    EXPECT_THAT(names(contents(items)), ElementsAre());
}

TEST_F(ZipArchiveTest, whatCannotBeOpenedIsNamedAtTheEnd) {
    if (::geteuid() == 0) {
        MARROWDALE_SKIP_FOR_USER("root opens everything");
    }
    std::filesystem::create_directories(path("In"));
    writeFile(path("In/open"), "open");
    writeFile(path("In/closed"), "closed");
    ASSERT_EQ(::chmod(path("In/closed").c_str(), 0), 0);
    const Json entries = contents({item("In")});
    EXPECT_THAT(names(entries), ElementsAre("In/", "In/open", "NOT IN THIS ARCHIVE.txt"));
    EXPECT_EQ(entries[2]["content"], "\"In/closed\": Permission denied\r\n");
}

TEST_F(ZipArchiveTest, aFileThatGrowsOrShrinksMeanwhileIsWhole) {
    for (const char* const name : {"grows", "shrinks"}) {
        writeFile(path(name), std::string(10'000, 'x'));
    }
    ZipArchive archive({item("grows"), item("shrinks")});
    std::string all;
    std::string piece(64, '\0');
    for (const std::string name : {"grows", "shrinks"}) {
        while (!all.ends_with("xxx") || !all.contains(name)) {
            const auto count = archive.read(piece);
            ASSERT_TRUE(count && *count > 0);
            all.append(piece, 0, *count);
        }
        if (name == "grows") {
            std::filesystem::resize_file(path(name), 20'000);
        } else {
            std::filesystem::resize_file(path(name), 5'000);
        }
    }
    for (auto count = archive.read(piece); count && *count > 0; count = archive.read(piece)) {
        all.append(piece, 0, *count);
    }
    writeFile(archivePath_, all);
    const Json found = readBack(archivePath_);
    EXPECT_TRUE(found["bad"].is_null());
    EXPECT_EQ(found["entries"][0]["size"], 10'000);
    EXPECT_EQ(found["entries"][1]["size"], 5'000);
}

// Put together by hand, with holes in place of content.
TEST_F(ZipArchiveTest, sizesAndPlacesBeyondFourGibibytesAreRight) {
    constexpr std::uint64_t large = 5'000'000'000;
    ZipEntry first;
    first.name = "large";
    first.mode = S_IFREG | S_IRUSR;
    first.longestSize = first.size = large;
    ZipEntry second = first;
    second.name = "far";
    second.longestSize = second.size = 0;

    const native::UniqueFD file(::open(archivePath_.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
    std::uint64_t at = 0;
    const auto put = [&](const std::string& text) {
        EXPECT_EQ(::pwrite(file.get(), text.data(), text.size(), static_cast<off_t>(at)),
                  static_cast<ssize_t>(text.size()));
        at += text.size();
    };
    put(zipHead(first));
    at += large;
    put(zipTail(first));
    second.offset = at;
    put(zipHead(second) + zipTail(second));
    const std::uint64_t directory = at;
    const std::string records = zipDirectoryRecord(first) + zipDirectoryRecord(second);
    put(records);
    put(zipEnd(2, records.size(), directory));
    const Json entries = readBack(archivePath_, "unchecked")["entries"];
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0]["size"], large);
    EXPECT_EQ(entries[1]["name"], "far");
    EXPECT_EQ(entries[1]["offset"], second.offset);
}

TEST_F(ZipArchiveTest, moreThanSixtyFiveThousandEntriesAreCounted) {
    std::string archive;
    std::string records;
    constexpr int many = 70'000;
    for (int i = 0; i < many; ++i) {
        ZipEntry entry;
        entry.name = std::to_string(i);
        entry.offset = archive.size();
        archive += zipHead(entry) + zipTail(entry);
        records += zipDirectoryRecord(entry);
    }
    const std::uint64_t directory = archive.size();
    writeFile(archivePath_, archive + records + zipEnd(many, records.size(), directory));
    EXPECT_EQ(readBack(archivePath_, "unchecked")["entries"].size(), std::size_t{many});
}

}  // namespace
}  // namespace marrowdale::host
