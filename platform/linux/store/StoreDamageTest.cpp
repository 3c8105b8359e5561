// A store whose files were cut, changed, lost or come from a later program: the answers are right,
// or the store is another one. Never wrong, never a crash.

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/Frame.h"
#include "platform/linux/store/StoreTestSupport.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;

// What has the checksum of its header where.
struct ChecksumPlace {
    std::string file;
    std::size_t version;   // offset of the format version
    std::size_t checksum;  // 0: the last four bytes of the file
};

class StoreDamageTest : public StoreTestBase {
  protected:
    // A small store that has every kind of file: a snapshot, and a log behind it.
    void makeStore() {
        write("a");
        write("folder/b");
        write("folder/c");
        open();
        (void)assign("folder");
        close();
        write("later");
        open();
        given_ = assign("");
        given_.merge(Documents(assign("folder")));
        uuid_ = store().report().uuid;
        close();
        lies_ = storeIn(state());
        kept_ = state() + ".kept";
        fs::copy(state(), kept_, fs::copy_options::recursive);
        fs::copy(cache(), kept_ + ".cache", fs::copy_options::recursive);
    }
    void restore() {
        close();
        fs::remove_all(state());
        fs::remove_all(cache());
        fs::copy(kept_, state(), fs::copy_options::recursive);
        fs::copy(kept_ + ".cache", cache(), fs::copy_options::recursive);
    }
    [[nodiscard]] std::vector<std::string> files() const {
        std::vector<std::string> names;
        for (const auto& entry : fs::directory_iterator(storeIn(kept_))) {
            names.push_back(entry.path().filename());
        }
        std::ranges::sort(names);
        return names;
    }
    [[nodiscard]] std::string file(const std::string& name) const { return lies_ + "/" + name; }
    // Either the same store with the same answers, or another one that knows none of the old
    // identifiers. Answers which.
    bool openAndCheck(const std::string& what) {
        auto opened = tryOpen();
        if (!opened) {
            ADD_FAILURE() << what << ": " << opened.error().description();
            return false;
        }
        const bool same = (*opened)->report().uuid == uuid_;
        EXPECT_EQ((*opened)->report().rebuildReason.empty(), same) << what;
        for (const auto& [name, document] : given_) {
            const auto found = (*opened)->resolveDocumentID(document, device());
            const bool inFolder = name == "b" || name == "c";
            if (same) {
                EXPECT_TRUE(found) << what << " " << name;
                EXPECT_EQ(*found, status(inFolder ? "folder/" + name : name).fileID) << what;
            } else {
                EXPECT_FALSE(found) << what << " " << name;
            }
        }
        return same;
    }

    Documents given_;
    UUID uuid_;
    std::string lies_;  // where the store does
    std::string kept_;  // a copy of the state folder
};

TEST_P(StoreDamageTest, CutAtEveryLengthOfEveryFile) {
    makeStore();
    for (const auto& name : files()) {
        const auto size = fs::file_size(storeIn(kept_) + "/" + name);
        for (std::uintmax_t length = 0; length < size; ++length) {
            restore();
            fs::resize_file(file(name), length);
            ASSERT_FALSE(openAndCheck(name + " cut at " + std::to_string(length)));
        }
    }
}

TEST_P(StoreDamageTest, EveryByteOfEveryFileFlipped) {
    makeStore();
    for (const auto& name : files()) {
        const std::string whole = readFile(storeIn(kept_) + "/" + name);
        for (std::size_t at = 0; at < whole.size(); ++at) {
            restore();
            std::string changed = whole;
            changed[at] = static_cast<char>(changed[at] ^ (1 << (at % 8)));
            writeFile(file(name), changed);
            ASSERT_FALSE(openAndCheck(name + " flipped at " + std::to_string(at)));
        }
    }
}

TEST_P(StoreDamageTest, EveryFileMissing) {
    makeStore();
    for (const auto& name : files()) {
        restore();
        fs::remove(file(name));
        EXPECT_FALSE(openAndCheck(name + " missing"));
    }
    restore();
    fs::remove_all(lies_);
    auto opened = tryOpen();
    ASSERT_TRUE(opened);
    EXPECT_NE((*opened)->report().uuid, uuid_);
}

TEST_P(StoreDamageTest, EveryFileGrown) {
    makeStore();
    for (const auto& name : files()) {
        restore();
        writeFile(file(name), readFile(file(name)) + "some bytes more");
        const bool same = openAndCheck(name + " grown");
        // Behind the head the log may have a torn tail; anything else has its exact size.
        EXPECT_EQ(same, name.starts_with("log-")) << name;
    }
}

TEST_P(StoreDamageTest, TheDamagedStoreIsKeptOnce) {
    makeStore();
    writeFile(file("head"), "nonsense");
    open();
    EXPECT_EQ(readFile(damagedFor(lies_) + "/head"), "nonsense");
    EXPECT_THAT(store().report().rebuildReason, testing::HasSubstr("/head"));
    close();
    writeFile(file("head"), "again");
    open();
    EXPECT_EQ(readFile(damagedFor(lies_) + "/head"), "again");
    EXPECT_FALSE(fs::exists(damagedFor(lies_) + "/" + fs::path(lies_).filename().string()));
}

TEST_P(StoreDamageTest, ALaterFormatIsRefusedAndLeftAlone) {
    makeStore();
    const auto names = files();
    const std::string segment = *std::ranges::find_if(
        names, [](const std::string& name) { return name.starts_with("log-"); });
    const std::vector<ChecksumPlace> places{
        {"identity", 8, 0}, {"head", 8, 0}, {"identifiers", 8, 0}, {segment, 8, 60}};
    for (const auto& place : places) {
        restore();
        std::string bytes = readFile(file(place.file));
        bytes[place.version] = 2;
        const std::size_t at = place.checksum == 0 ? bytes.size() - 4 : place.checksum;
        const std::uint32_t checksum = crc32c(std::as_bytes(std::span(bytes).first(at)));
        std::memcpy(bytes.data() + at, &checksum, sizeof checksum);
        writeFile(file(place.file), bytes);
        const auto opened = tryOpen();
        ASSERT_FALSE(opened) << place.file;
        EXPECT_EQ(opened.error().code, EPROTO) << place.file;
        EXPECT_THAT(opened.error().subject, testing::HasSubstr("format version 2"));
        for (const auto& name : files()) {
            if (name != place.file) {
                EXPECT_EQ(readFile(file(name)), readFile(storeIn(kept_) + "/" + name)) << name;
            }
        }
        EXPECT_EQ(readFile(file(place.file)), bytes);
    }
}

TEST_P(StoreDamageTest, UnfinishedThingsAreSweptAndHarmless) {
    makeStore();
    const std::string ofAnotherRoot = state() + "/store-0123456789abcdef.new";
    for (const std::string& folder : {lies_ + ".new", ofAnotherRoot}) {
        makeFolder(folder);
        writeFile(folder + "/identity", "half");
    }
    writeFile(file("snapshot.new"), "half");
    writeFile(file("identity.new"), "half");
    makeFolder(state() + "/store-of-somebody.new");
    EXPECT_TRUE(openAndCheck("unfinished"));
    EXPECT_FALSE(fs::exists(lies_ + ".new"));
    EXPECT_FALSE(fs::exists(ofAnotherRoot));
    EXPECT_FALSE(fs::exists(file("snapshot.new")));
    EXPECT_FALSE(fs::exists(file("identity.new")));
    EXPECT_TRUE(fs::exists(state() + "/store-of-somebody.new"));
}

// What is tried thousands of times is bytes, not a file system: in memory where that can be.
std::vector<TestFileSystem> whereItIsFast() {
    const std::string memory = "/dev/shm";
    const bool usable = ::access(memory.c_str(), W_OK | X_OK) == 0;
    return usable ? std::vector<TestFileSystem>{{"memory", memory}} : testFileSystems();
}

INSTANTIATE_TEST_SUITE_P(In, StoreDamageTest, testing::ValuesIn(whereItIsFast()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
