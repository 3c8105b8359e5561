// Streams over a store that records an application's documents beside its root: real folders, real
// events.

#include <csignal>
#include <filesystem>
#include <memory>
#include <string>
#include <sys/wait.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/Store.h"
#include "platform/linux/streams/LinuxFileEvents.h"
#include "platform/linux/streams/StreamsTestWorld.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;
using testing::Contains;
using testing::IsSupersetOf;
using testing::Not;

class LibraryStreamsTest : public testing::TestWithParam<TestFileSystem> {
  protected:
    LibraryStreamsTest() {
        makeFolder(root());
        makeFolder(library());
    }
    ~LibraryStreamsTest() override { close(); }

    [[nodiscard]] std::string root() const { return directory_.path("root"); }
    [[nodiscard]] std::string library() const {
        return directory_.path("apps/org.example.A/Documents");
    }
    [[nodiscard]] std::vector<LibraryFolder> libraries() const {
        return {{"org.example.A", library()}};
    }
    [[nodiscard]] StoreOptions options(std::vector<LibraryFolder> libraries) const {
        StoreOptions options;
        options.stateFolder = directory_.path("state");
        options.rootPath = root();
        options.libraries = std::move(libraries);
        options.recording = StoreOptions::Recording::live;
        return options;
    }
    void open(std::vector<LibraryFolder> libraries) {
        auto opened = Store::open(options(std::move(libraries)));
        ASSERT_TRUE(opened) << opened.error().description();
        store_ = std::move(*opened);
        service_ = std::make_unique<LinuxFileEvents>(*store_);
    }
    void close() {
        stream_.reset();
        service_.reset();
        store_.reset();
    }
    [[nodiscard]] Store& store() { return *store_; }
    // From then on `got_` gets them.
    void stream(std::vector<std::string> paths, EventID since,
                std::optional<DeviceID> device = {}) {
        got_ = std::make_shared<Collected>();
        FileEventStreamRequest request{
            std::move(paths),
            device,
            since,
            std::chrono::milliseconds(0),
            0x51,
            queue_,
            [got = got_](std::span<const FileEvent> batch) { got->take(batch); }};
        stream_ = service_->makeStream(std::move(request));
        stream_->start();
        ASSERT_TRUE(waitUntil([&] { return got_->isHistoryDone(); }));
    }
    // Paths, a "-" before those that are gone.
    [[nodiscard]] std::vector<std::string> paths() const {
        std::vector<std::string> paths;
        for (const FileEvent& event : got_->events()) {
            if (event.path) {
                const bool isGone = (event.flags & FileEventFlag::gone) != 0;
                paths.push_back((isGone ? "-" : "") + *event.path);
            }
        }
        return paths;
    }
    [[nodiscard]] bool has(const std::string& path) const {
        const auto all = paths();
        return std::ranges::find(all, path) != all.end();
    }
    void waitForPath(const std::string& path) {
        ASSERT_TRUE(waitUntil([&] { return has(path); })) << path;
    }
    [[nodiscard]] bool wasDropped() const {
        return got_->countOf(FileEventFlag::kernelDropped) > 0;
    }
    [[nodiscard]] DocumentID documentAt(const std::string& path) {
        const auto document =
            store().permanentStorageForItemAtURL(URL::fileURL(path), AllocateIfNone::yes);
        EXPECT_TRUE(document) << document.error().description();
        return document ? *document : DocumentID{};
    }

    TemporaryDirectory directory_{GetParam().dir};
    SerialQueue queue_{"reader"};
    std::unique_ptr<Store> store_;
    std::unique_ptr<LinuxFileEvents> service_;
    std::shared_ptr<Collected> got_ = std::make_shared<Collected>();
    std::unique_ptr<FileEventStream> stream_;
};

TEST_P(LibraryStreamsTest, OneStreamTellsOfBothInTheOrderOfTheirIdentifiers) {
    open(libraries());
    const EventID start = *store().barrier();
    writeFile(root() + "/before", "x");
    writeFile(library() + "/before", "x");
    stream({root(), library()}, start);
    EXPECT_FALSE(wasDropped());
    EXPECT_THAT(paths(), IsSupersetOf({root() + "/before", library() + "/before"}));
    writeFile(library() + "/live", "x");
    waitForPath(library() + "/live");
    writeFile(root() + "/live", "x");
    waitForPath(root() + "/live");
    const auto events = got_->events();
    EXPECT_TRUE(std::ranges::is_sorted(events, {}, &FileEvent::id));
}

TEST_P(LibraryStreamsTest, AStreamOnTheRootHearsNothingOfThem) {
    open(libraries());
    stream({root()}, *store().barrier());
    writeFile(library() + "/unheard", "x");
    writeFile(root() + "/heard", "x");
    waitForPath(root() + "/heard");
    EXPECT_THAT(paths(), Not(Contains(library() + "/unheard")));
}

TEST_P(LibraryStreamsTest, TheFeedOfTheDeviceTellsOfSavesInAllTrees) {
    writeFile(library() + "/note", "first");
    writeFile(root() + "/mine", "first");
    open(libraries());
    const auto note = documentAt(library() + "/note");
    const auto mine = documentAt(root() + "/mine");
    stream({"/.docid"}, *store().barrier(), store().device());
    for (const auto& [folder, name] : {std::pair(library(), "/note"), std::pair(root(), "/mine")}) {
        writeFile(folder + "/temporary", "second");
        fs::rename(folder + "/temporary", folder + name);
    }
    const auto toldOf = [&](DocumentID document) {
        const std::string part = "/changed/" + std::to_string(raw(document)) + "/";
        const auto all = paths();
        return std::ranges::any_of(all, [&](const auto& path) { return path.contains(part); });
    };
    EXPECT_TRUE(waitUntil([&] { return toldOf(note) && toldOf(mine); }));
    EXPECT_EQ(documentAt(library() + "/note"), note);
    EXPECT_EQ(documentAt(root() + "/mine"), mine);
}

TEST_P(LibraryStreamsTest, WhoeverReadsFromBeforeALibraryCameIsToldAllOfIt) {
    writeFile(library() + "/note", "x");
    open({});
    const EventID start = *store().barrier();
    ASSERT_TRUE(store().setLibraries(libraries()));
    stream({root(), library()}, start);
    EXPECT_FALSE(wasDropped());
    EXPECT_THAT(paths(), Contains(library() + "/note"));
    writeFile(library() + "/live", "x");
    waitForPath(library() + "/live");
}

TEST_P(LibraryStreamsTest, WhatIsNotRecordedIsDroppedAndTheRestIsTold) {
    open({});
    stream({root(), library()}, *store().barrier());
    EXPECT_TRUE(wasDropped());
    writeFile(root() + "/live", "x");
    waitForPath(root() + "/live");
}

TEST_P(LibraryStreamsTest, ALibraryThatIsDeletedIsToldByItself) {
    makeFolder(library() + "/folder");
    writeFile(library() + "/folder/note", "x");
    open(libraries());
    const auto note = documentAt(library() + "/folder/note");
    stream({root(), library()}, *store().barrier());
    fs::remove_all(library());
    waitForPath("-" + library());
    EXPECT_THAT(paths(),
                IsSupersetOf({"-" + library() + "/folder", "-" + library() + "/folder/note"}));
    const auto events = got_->events();
    EXPECT_TRUE(std::ranges::any_of(
        events, [&](const FileEvent& event) { return event.goneDocument == note; }));
    EXPECT_FALSE(wasDropped());
    writeFile(root() + "/live", "x");
    waitForPath(root() + "/live");
    EXPECT_FALSE(wasDropped());
}

// The process that has the store is killed while it records.
TEST_P(LibraryStreamsTest, AKillLosesNothingOfALibrary) {
    writeFile(library() + "/note", "x");
    open(libraries());
    const auto note = documentAt(library() + "/note");
    const EventID start = *store().barrier();
    close();
    const pid_t process = ::fork();
    if (process == 0) {
        auto store = Store::open(options(libraries()));
        if (store) {
            writeFile(library() + "/by the killed", "x");
            (void)(*store)->barrier();
            fs::rename(library() + "/note", library() + "/renamed");
        }
        ::raise(SIGKILL);
    }
    ::waitpid(process, nullptr, 0);
    open(libraries());
    stream({root(), library()}, start);
    EXPECT_FALSE(wasDropped());
    EXPECT_THAT(paths(), IsSupersetOf({library() + "/by the killed", "-" + library() + "/note",
                                       library() + "/renamed"}));
    EXPECT_EQ(documentAt(library() + "/renamed"), note);
}

INSTANTIATE_TEST_SUITE_P(OnEach, LibraryStreamsTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
