#include <cerrno>
#include <fcntl.h>

#include <gtest/gtest.h>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/RecordedRoots.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class RecordedRootsTest : public testing::Test {
  protected:
    RecordedRootsTest() {
        makeFolder(folder_.path("root"));
        makeFolder(folder_.path("a"));
        roots_.emplace(folder_.path("root"), *openFolder(folder_.path("root")));
        roots_->noteRoot(*statEntry(AT_FDCWD, folder_.path("root").c_str()));
        roots_->setLibraries({library("key.a", "a"), library("key.none", "none")});
    }
    [[nodiscard]] RecordedRoots::FolderPointer library(const std::string& key,
                                                       const std::string& name) const {
        auto folder = std::make_shared<RecordedRoots::Folder>();
        folder->key = key;
        folder->path = folder_.path(name);
        if (auto opened = openFolder(folder->path)) {
            const auto status = statEntry(opened->get(), "");
            folder->open = std::move(*opened);
            folder->device = status->device;
            folder->file = status->fileID;
        } else {
            folder->problem = opened.error();
        }
        return folder;
    }
    // "KEY: PATH"; empty for none.
    [[nodiscard]] std::string placeOf(std::string_view storedPath) const {
        const auto place = roots_->place(storedPath);
        return place ? place->in->key + ": " + place->path : std::string();
    }

    TemporaryDirectory folder_;
    std::optional<RecordedRoots> roots_;
};

TEST_F(RecordedRootsTest, AStoredPathIsAPlaceInOneOfTheTrees) {
    EXPECT_EQ(placeOf(""), ": ");
    EXPECT_EQ(placeOf("x/y"), ": x/y");
    EXPECT_EQ(placeOf("key.a/y"), ": key.a/y");
    EXPECT_EQ(placeOf("/key.a"), "key.a: ");
    EXPECT_EQ(placeOf("/key.a/x/y"), "key.a: x/y");
    EXPECT_EQ(placeOf("/key.ab/x"), "");
    EXPECT_EQ(placeOf("/key.none/x"), "") << "it is not open";
    EXPECT_EQ(placeOf("/other"), "");
}

TEST_F(RecordedRootsTest, PathsGoThereAndBack) {
    for (const auto& [stored, name] :
         {std::pair("", "root"), std::pair("x/y", "root/x/y"), std::pair("/key.a", "a"),
          std::pair("/key.a/x/y", "a/x/y")}) {
        EXPECT_EQ(roots_->absolutePath(stored), folder_.path(name));
        EXPECT_EQ(roots_->storedPath(folder_.path(name)), stored);
    }
    EXPECT_EQ(roots_->storedPath(folder_.path("a//x")), "/key.a/x");
    EXPECT_EQ(roots_->absolutePath("/key.none/x"), folder_.path("none/x"));
    EXPECT_EQ(roots_->absolutePath("/other/x"), std::nullopt);
    EXPECT_EQ(roots_->storedPath(folder_.path("none/x")), std::nullopt);
    EXPECT_EQ(roots_->storedPath(folder_.path("rootx")), std::nullopt);
    EXPECT_EQ(roots_->storedPath(folder_.path("")), std::nullopt);
}

TEST_F(RecordedRootsTest, TheFileSystemsOwnRootCanBeOne) {
    const RecordedRoots roots("/", *openFolder("/"));
    EXPECT_EQ(roots.absolutePath(""), "/");
    EXPECT_EQ(roots.absolutePath("usr/lib"), "/usr/lib");
    EXPECT_EQ(roots.storedPath("/"), "");
    EXPECT_EQ(roots.storedPath("/usr/lib"), "usr/lib");
}

TEST_F(RecordedRootsTest, AFolderIsKnownByWhatItIs) {
    const auto at = [&](const char* name) {
        const auto folder =
            roots_->folderAt(*statEntry(AT_FDCWD, folder_.path(std::string(name)).c_str()));
        return folder == nullptr ? std::string("none") : folder->storedPath();
    };
    makeFolder(folder_.path("a/in"));
    EXPECT_EQ(at("root"), "");
    EXPECT_EQ(at("a"), "/key.a");
    EXPECT_EQ(at("a/in"), "none");
}

TEST_F(RecordedRootsTest, WhatWasAskedForStaysOpen) {
    const auto place = roots_->place("/key.a/x");
    roots_->setLibraries({});
    EXPECT_EQ(placeOf("/key.a/x"), "");
    EXPECT_EQ(roots_->library("key.a"), nullptr);
    EXPECT_TRUE(statEntry(place->folder(), ""));
}

TEST_F(RecordedRootsTest, NothingIsMissedOfALibraryThatIsNotThere) {
    EXPECT_TRUE(roots_->root().isRecorded());
    EXPECT_TRUE(roots_->library("key.a")->isRecorded());
    EXPECT_TRUE(roots_->library("key.none")->isRecorded());
    RecordedRoots::Folder unreadable;
    unreadable.problem = errorWithPOSIXCode(EACCES, "record", "x");
    EXPECT_FALSE(unreadable.isRecorded());
}

}  // namespace
}  // namespace marrowdale::native
