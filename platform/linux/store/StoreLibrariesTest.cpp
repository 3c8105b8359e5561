// Folders that are recorded beside the root: what happens in them is told, they come and go, and
// what can't be recorded stands in nobody's way.

#include <atomic>
#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using testing::UnorderedElementsAre;

class StoreLibrariesTest : public StoreEventsTest {
  protected:
    [[nodiscard]] StoreOptions options() const override {
        StoreOptions options = StoreEventsTest::options();
        options.libraries = libraries_;
        options.packages = &packages_;
        return options;
    }
    [[nodiscard]] std::string apps() const {
        return fs::path(root()).parent_path().string() + "/apps";
    }
    [[nodiscard]] std::string folderOf(const std::string& key) const {
        return apps() + "/" + key + "/Documents";
    }
    [[nodiscard]] LibraryFolder library(const std::string& key) const {
        return {key, folderOf(key)};
    }
    // In an application's folder, which is made where it is missing.
    void writeIn(const std::string& key, const std::string& name,
                 const std::string& contents = "x") const {
        const std::string file = folderOf(key) + "/" + name;
        makeFolder(fs::path(file).parent_path());
        writeFile(file, contents);
    }
    // From the next look on: now where the store is open, else when it is opened.
    void serve(std::vector<LibraryFolder> libraries) {
        libraries_ = libraries;
        if (isLive()) {
            const auto done = store().setLibraries(std::move(libraries));
            ASSERT_TRUE(done) << done.error().description();
        }
    }
    void beginWith(std::vector<LibraryFolder> libraries) {
        libraries_ = std::move(libraries);
        begin();
    }
    DocumentID documentIn(const std::string& folder, const std::string& name) {
        DocumentID document{};
        withStore([&] {
            auto requests = makeRequests(folder);
            document = assign(requests).at(name);
        });
        return document;
    }
    // Its path; what went wrong instead.
    std::string whereIs(DocumentID document) {
        std::string where;
        withStore([&] {
            const auto file = store().resolveDocumentID(document, device());
            const auto found = file ? store().pathForFileID(device(), *file)
                                    : Expected<std::string>(Unexpected(file.error()));
            where = found ? *found : "code " + std::to_string(found.error().code);
        });
        return where;
    }
    // 0 for a library that is recorded.
    int problemOf(const std::string& key) {
        int code = -1;
        withStore([&] {
            for (const LibraryReport& report : store().report().libraries) {
                if (report.key == key) {
                    code = report.problem ? report.problem->code : 0;
                }
            }
        });
        return code;
    }
    void settleIn() {
        (void)newsOnce();
        settle();
        (void)newsOnce();
    }

    std::vector<LibraryFolder> libraries_;
    const PackageTypes packages_{std::vector<std::string>{"note"}};
    const std::string a_ = "org.example.A";
    const std::string b_ = "org.example.B";
};

std::string goneWith(const std::string& path, DocumentID document) {
    return "gone " + path + " (did=" + std::to_string(raw(document)) + ")";
}

TEST_P(StoreLibrariesTest, WhatHappensInThemIsToldUnderTheirKeys) {
    writeIn(a_, "known");
    writeIn(b_, "folder/known");
    write("known");
    beginWith({library(a_), library(b_)});
    EXPECT_THAT(news(), IsEmpty()) << "the first fill is silent";
    writeIn(a_, "note");
    writeIn(b_, "folder/known", "changed");
    fs::remove(folderOf(a_) + "/known");
    write("mine");
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("gone /org.example.A/known", "appeared /org.example.A/note",
                                     "changed /org.example.B/folder/known", "appeared mine"));
}

TEST_P(StoreLibrariesTest, TheirDocumentsHaveIdentifiersThatLast) {
    writeIn(a_, "folder/note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_) + "/folder", "note");
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/folder/note");
    fs::rename(folderOf(a_) + "/folder/note", folderOf(a_) + "/renamed");
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/renamed");
    EXPECT_THAT(newsOnce(), IsSupersetOf({"renamed /org.example.A/renamed"}));
    EXPECT_EQ(documentIn(folderOf(a_), "renamed"), note);
    withStore([&] {
        const auto folder = statEntry(AT_FDCWD, folderOf(a_).c_str())->fileID;
        EXPECT_EQ(*store().pathForFileID(device(), folder), folderOf(a_));
        const auto same = store().permanentStorageForItemAtURL(
            URL::fileURL(folderOf(a_) + "/renamed"), AllocateIfNone::no);
        ASSERT_TRUE(same) << same.error().description();
        EXPECT_EQ(*same, note);
    });
}

TEST_P(StoreLibrariesTest, ASafeSaveKeepsTheIdentifierWithTheName) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    settleIn();
    writeIn(a_, "temporary", "second");
    fs::rename(folderOf(a_) + "/temporary", folderOf(a_) + "/note");
    EXPECT_THAT(newsOnce(), Contains("moved document"));
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/note");
    EXPECT_EQ(documentIn(folderOf(a_), "note"), note);
}

TEST_P(StoreLibrariesTest, WhatMovesBetweenTreesKeepsItsIdentifier) {
    writeIn(a_, "note");
    writeIn(a_, "folder/deep");
    makeFolder(path("in"));
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    const auto deep = documentIn(folderOf(a_) + "/folder", "deep");
    settleIn();
    fs::rename(folderOf(a_) + "/note", path("in/note"));
    fs::rename(folderOf(a_) + "/folder", path("folder"));
    const auto out = newsOnce();
    EXPECT_THAT(out, IsSupersetOf({"gone+renamed /org.example.A/note", "renamed in/note",
                                   "gone+renamed /org.example.A/folder/", "renamed folder/"}));
    EXPECT_EQ(whereIs(note), path("in/note"));
    EXPECT_EQ(whereIs(deep), path("folder/deep"));
    fs::rename(path("in/note"), folderOf(a_) + "/back");
    fs::rename(path("folder"), folderOf(a_) + "/folder");
    EXPECT_THAT(newsOnce(), IsSupersetOf({"gone+renamed in/note", "renamed /org.example.A/back",
                                          "renamed /org.example.A/folder/"}));
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/back");
    EXPECT_EQ(whereIs(deep), folderOf(a_) + "/folder/deep");
    EXPECT_EQ(documentIn(folderOf(a_), "back"), note);
}

TEST_P(StoreLibrariesTest, EverythingInANewOneIsTold) {
    write("mine");
    writeIn(a_, "folder/note");
    beginWith({});
    serve({library(a_)});
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("appeared /org.example.A/", "appeared /org.example.A/folder/",
                                     "appeared /org.example.A/folder/note"));
    writeIn(a_, "folder/later");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared /org.example.A/folder/later"));
}

TEST_P(StoreLibrariesTest, OneThatIsNoMoreServedIsNotLookedAt) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    serve({});
    writeIn(a_, "unseen");
    write("mine");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared mine"));
    EXPECT_EQ(whereIs(note), "code " + std::to_string(ENOENT));
    withStore([&] {
        auto requests = makeRequests(folderOf(a_));
        const auto refused = store().assignDocumentIDs(requests.requests);
        ASSERT_FALSE(refused);
        EXPECT_EQ(refused.error().code, ENOENT);
    });
}

TEST_P(StoreLibrariesTest, OneThatIsServedAgainIsToldWholeAndKeepsItsIdentifiers) {
    writeIn(a_, "kept");
    writeIn(a_, "deleted");
    writeIn(a_, "saved");
    writeIn(b_, "other");
    beginWith({library(a_), library(b_)});
    const auto kept = documentIn(folderOf(a_), "kept");
    const auto deleted = documentIn(folderOf(a_), "deleted");
    const auto saved = documentIn(folderOf(a_), "saved");
    settleIn();
    serve({library(b_)});
    (void)newsOnce();
    fs::remove(folderOf(a_) + "/deleted");
    writeIn(a_, "made");
    writeIn(a_, "temporary", "second");
    fs::rename(folderOf(a_) + "/temporary", folderOf(a_) + "/saved");
    serve({library(a_), library(b_)});
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("moved document", goneWith("/org.example.A/deleted", deleted),
                                     "gone /org.example.A/saved", "appeared /org.example.A/",
                                     "appeared /org.example.A/kept", "appeared /org.example.A/made",
                                     "appeared /org.example.A/saved"));
    EXPECT_EQ(whereIs(kept), folderOf(a_) + "/kept");
    EXPECT_EQ(whereIs(saved), folderOf(a_) + "/saved");
    EXPECT_EQ(documentIn(folderOf(a_), "saved"), saved);
    EXPECT_THAT(newsOnce(), IsEmpty()) << "told once";
}

TEST_P(StoreLibrariesTest, WhatWasInOneWhoseFolderIsGoneIsGone) {
    writeIn(a_, "folder/note");
    write("mine");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_) + "/folder", "note");
    settleIn();
    fs::remove_all(folderOf(a_));
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("gone /org.example.A/", "gone /org.example.A/folder/",
                                     goneWith("/org.example.A/folder/note", note)));
    EXPECT_EQ(whereIs(note), "code " + std::to_string(ENOENT));
    EXPECT_EQ(problemOf(a_), ENOENT);
    write("later");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared later")) << "the root is recorded";
    writeIn(a_, "new");
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("appeared /org.example.A/", "appeared /org.example.A/new"));
    EXPECT_EQ(problemOf(a_), 0);
    writeIn(a_, "newer");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared /org.example.A/newer"));
}

TEST_P(StoreLibrariesTest, OneThatIsGoneAndNoMoreServedIsGoneToo) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    settleIn();
    fs::remove_all(folderOf(a_));
    serve({});
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("gone /org.example.A/",
                                                 goneWith("/org.example.A/note", note)));
}

TEST_P(StoreLibrariesTest, WhatWasForgottenAboutIsGoneWhenItsFolderIs) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    serve({});
    (void)newsOnce();
    fs::remove_all(folderOf(a_));
    makeFolder(folderOf(b_));
    serve({library(b_)});
    EXPECT_THAT(newsOnce(), IsSupersetOf({std::string("gone /org.example.A/"),
                                          goneWith("/org.example.A/note", note)}));
}

TEST_P(StoreLibrariesTest, AnotherFolderAtThePathIsAnotherLibrary) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    settleIn();
    fs::rename(folderOf(a_), apps() + "/away");
    writeIn(a_, "note");
    const auto texts = newsOnce();
    EXPECT_THAT(texts, IsSupersetOf({goneWith("/org.example.A/note", note),
                                     std::string("appeared /org.example.A/note")}));
    EXPECT_NE(documentIn(folderOf(a_), "note"), note);
}

TEST_P(StoreLibrariesTest, ALibraryThatIsMovedIntoTheRootIsAFolderOfIt) {
    writeIn(a_, "folder/note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_) + "/folder", "note");
    settleIn();
    fs::rename(folderOf(a_), path("mine"));
    EXPECT_THAT(newsOnce(), IsSupersetOf({"gone /org.example.A/", "appeared mine/"}));
    EXPECT_EQ(whereIs(note), path("mine/folder/note"));
    write("mine/folder/later");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared mine/folder/later"));
    fs::rename(path("mine"), folderOf(a_));
    EXPECT_THAT(newsOnce(), Contains("appeared /org.example.A/"));
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/folder/note");
    writeIn(a_, "folder/last");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared /org.example.A/folder/last"));
}

TEST_P(StoreLibrariesTest, AKeyMakesNoPackage) {
    writeIn("org.example.note", "inner");
    beginWith({library("org.example.note")});
    writeIn("org.example.note", "made");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared /org.example.note/made"));
}

TEST_P(StoreLibrariesTest, LibrariesAreNoSubfoldersOfTheRoot) {
    makeFolder(path("folder"));
    writeIn(a_, "folder/note");
    beginWith({library(a_)});
    for (int i = 0; i < 2; ++i) {
        withStore([&] {
            EXPECT_EQ(store().subfolderCount(status("").fileID), 1U);
            const auto folder = statEntry(AT_FDCWD, folderOf(a_).c_str())->fileID;
            EXPECT_EQ(store().subfolderCount(folder), 1U);
            libraries_.clear();
            ASSERT_TRUE(store().setLibraries({}));
            EXPECT_EQ(store().subfolderCount(status("").fileID), 1U);
            libraries_ = {library(a_)};
            ASSERT_TRUE(store().setLibraries(libraries_));
        });
    }
}

TEST_P(StoreLibrariesTest, OnesThatCantBeRecordedStandInNobodysWay) {
    writeIn(a_, "note");
    makeFolder(apps() + "/linked");
    fs::create_directory_symlink(folderOf(a_), apps() + "/linked/Documents");
    fs::create_directory_symlink(apps() + "/" + a_, apps() + "/above");
    makeFolder(apps() + "/file");
    writeFile(apps() + "/file/Documents", "x");
    makeFolder(path("inside"));
    makeFolder(apps() + "/" + a_ + "/Documents/inner");
    const std::string parent = fs::path(root()).parent_path();
    beginWith({library(a_),
               library("linked"),
               {"above", apps() + "/above/Documents"},
               library("file"),
               library("missing"),
               {"inside", path("inside")},
               {"outside", parent},
               {"root", root()},
               {"state", state()},
               {"z.inner", folderOf(a_) + "/inner"},
               {"a/b", apps()},
               {"", apps()},
               {std::string(255, 'k'), apps()}});
    const auto check = [&] {
        EXPECT_EQ(problemOf(a_), 0);
        EXPECT_THAT(problemOf("linked"), testing::AnyOf(ENOTDIR, ELOOP));
        EXPECT_EQ(problemOf("above"), ELOOP);
        EXPECT_EQ(problemOf("file"), ENOTDIR);
        EXPECT_EQ(problemOf("missing"), ENOENT);
        EXPECT_EQ(problemOf("inside"), EINVAL);
        EXPECT_EQ(problemOf("outside"), EINVAL);
        EXPECT_EQ(problemOf("root"), EINVAL);
        EXPECT_EQ(problemOf("state"), EINVAL);
        EXPECT_EQ(problemOf("z.inner"), EINVAL);
        EXPECT_EQ(problemOf("a/b"), EINVAL);
        EXPECT_EQ(problemOf(""), EINVAL);
        EXPECT_EQ(problemOf(std::string(255, 'k')), EINVAL);
    };
    check();
    writeIn(a_, "inner/made");
    write("mine");
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("appeared /org.example.A/inner/made", "appeared mine"));
    check();
    std::vector<std::string> prefixes;
    withStore([&] {
        for (const EventRoot& each : store().roots()) {
            const bool isWell = each.prefix.empty() || each.prefix == "/" + a_;
            EXPECT_EQ(each.isRecorded, isWell || each.prefix == "/missing") << each.prefix;
            prefixes.push_back(each.prefix);
        }
        EXPECT_THAT(prefixes,
                    UnorderedElementsAre("", "/" + a_, "/linked", "/above", "/file", "/missing"));
    });
}

TEST_P(StoreLibrariesTest, OneOnAnotherVolumeIsLeftOutUntilItIsNot) {
    writeIn(a_, "note");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    settleIn();
    {
        const auto mount = ScopedMount::memory(folderOf(a_));
        if (!mount) {
            MARROWDALE_SKIP_FOR_USER("only root may mount");
        }
        writeIn(a_, "foreign");
        write("mine");
        EXPECT_THAT(newsOnce(), ElementsAre("appeared mine"));
        EXPECT_EQ(problemOf(a_), EXDEV);
        EXPECT_EQ(whereIs(note), "code " + std::to_string(ENOENT));
    }
    // A look at everything may tell once more of a file that was written a moment before.
    EXPECT_THAT(newsOnce(),
                IsSupersetOf({"appeared /org.example.A/", "appeared /org.example.A/note"}));
    EXPECT_EQ(problemOf(a_), 0);
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/note");
}

TEST_P(StoreLibrariesTest, OneThatCantBeReadIsLeftOutUntilItCan) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    writeIn(a_, "note");
    writeIn(b_, "note");
    beginWith({library(b_)});
    ASSERT_EQ(::chmod(folderOf(a_).c_str(), 0), 0);
    serve({library(a_), library(b_)});
    EXPECT_EQ(problemOf(a_), EACCES);
    writeIn(b_, "made");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared /org.example.B/made"));
    ASSERT_EQ(::chmod(folderOf(a_).c_str(), 0700), 0);
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("appeared /org.example.A/", "appeared /org.example.A/note"));
    EXPECT_EQ(problemOf(a_), 0);
}

TEST_P(StoreLibrariesTest, ADocumentIsKnownInEachOfTwoStoresTurns) {
    writeIn(a_, "note");
    write("mine");
    beginWith({library(a_)});
    const auto note = documentIn(folderOf(a_), "note");
    const auto mine = documentIn(root(), "mine");
    withStore([&] { reopen(); });
    EXPECT_EQ(whereIs(note), folderOf(a_) + "/note");
    EXPECT_EQ(whereIs(mine), path("mine"));
    EXPECT_EQ(documentIn(folderOf(a_), "note"), note);
    EXPECT_THAT(newsOnce(), IsEmpty());
}

TEST_P(StoreLibrariesTest, OfTwoWithOneKeyTheLowerPathCounts) {
    writeIn(a_, "note");
    writeIn(b_, "note");
    beginWith({{"key", folderOf(b_)}, {"key", folderOf(a_)}});
    for (int i = 0; i < 2; ++i) {
        writeIn(a_, "made" + std::to_string(i));
        writeIn(b_, "unseen" + std::to_string(i));
        EXPECT_THAT(newsOnce(), ElementsAre("appeared /key/made" + std::to_string(i)));
    }
}

class StoreLibrariesLiveTest : public StoreLibrariesTest {};

TEST_P(StoreLibrariesLiveTest, TheyComeAndGoWhileManyWriteAndAsk) {
    constexpr int files = 200;
    makeFolder(folderOf(a_));
    makeFolder(folderOf(b_));
    write("mine");
    beginWith({library(b_)});
    const auto mine = documentIn(root(), "mine");
    std::atomic<bool> isDone = false;
    std::thread writer([&] {
        for (int i = 0; i < files; ++i) {
            const std::string name = std::to_string(i);
            writeIn(a_, name);
            writeIn(b_, name);
            fs::rename(folderOf(b_) + "/" + name, path("moved" + name));
        }
        isDone = true;
    });
    std::thread asker([&] {
        while (!isDone) {
            const auto file = store().resolveDocumentID(mine, device());
            EXPECT_TRUE(file) << file.error().description();
            (void)store().report();
        }
    });
    for (int i = 0; !isDone || i < 10; ++i) {
        serve(i % 2 == 0 ? std::vector{library(a_), library(b_)} : std::vector{library(b_)});
    }
    writer.join();
    asker.join();
    serve({library(a_), library(b_)});
    (void)news();
    for (int i = 0; i < files; ++i) {
        const std::string name = std::to_string(i);
        EXPECT_EQ(whereIs(documentIn(folderOf(a_), name)), folderOf(a_) + "/" + name);
        EXPECT_EQ(pathOf(status("moved" + name).fileID), "moved" + name);
    }
    EXPECT_EQ(whereIs(mine), path("mine"));
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreLibrariesTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify,
                                                          Following::restart)),
                         nameOf);
INSTANTIATE_TEST_SUITE_P(OnEach, StoreLibrariesLiveTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
