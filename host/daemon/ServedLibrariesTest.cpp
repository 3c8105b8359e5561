#include <fcntl.h>

#include <gtest/gtest.h>

#include "host/daemon/ServedLibraries.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

class ServedLibrariesTest : public testing::Test {
  protected:
    ServedLibrariesTest() {
        makeFolder(folder_.path("root"));
        makeFolder(library("org.example.A"));
        makeFolder(library("org.example.B"));
    }
    [[nodiscard]] std::string library(const std::string& identifier) const {
        return folder_.path("apps/" + identifier + "/Documents");
    }
    [[nodiscard]] std::unique_ptr<native::Store> openStore(const std::vector<std::string>& paths) {
        native::StoreOptions options;
        options.stateFolder = folder_.path("state");
        options.rootPath = folder_.path("root");
        options.libraries = ServedLibraries::foldersAt(paths);
        options.recording = native::StoreOptions::Recording::live;
        auto store = native::Store::open(options);
        EXPECT_TRUE(store);
        return std::move(*store);
    }
    // "KEY" of each, with a "-" before those that are not recorded.
    [[nodiscard]] static std::vector<std::string> recorded(const native::Store& store) {
        std::vector<std::string> keys;
        for (const auto& each : store.report().libraries) {
            keys.push_back((each.problem ? "-" : "") + each.key);
        }
        return keys;
    }

    TemporaryDirectory folder_;
    std::shared_ptr<RecordingLogSink> sink_ = std::make_shared<RecordingLogSink>();
    Log log_{sink_, LogLevel::debug};
};

TEST_F(ServedLibrariesTest, AFolderIsKnownByItsApplication) {
    const auto folders = ServedLibraries::foldersAt({library("org.example.A"), "/b/Documents"});
    ASSERT_EQ(folders.size(), 2U);
    EXPECT_EQ(folders[0].key, "org.example.A");
    EXPECT_EQ(folders[0].path, library("org.example.A"));
    EXPECT_EQ(folders[1].key, "b");
}

TEST_F(ServedLibrariesTest, WhatIsSetIsRecordedAndServedWhenTheCallReturns) {
    const std::vector<std::string> first{library("org.example.A")};
    const auto store = openStore(first);
    ServedLibraries libraries(folder_.path("root"));
    native::ServedTrees trees(libraries.rootsWith(first), {});
    libraries.set(first);
    libraries.attach(*store, trees, first, log_);
    EXPECT_EQ(recorded(*store), std::vector<std::string>{"org.example.A"});
    libraries.set({library("org.example.A"), library("org.example.B"), folder_.path("none/x")});
    EXPECT_EQ(recorded(*store),
              (std::vector<std::string>{"-none", "org.example.A", "org.example.B"}));
    EXPECT_TRUE(*trees.locate(library("org.example.B")));
    EXPECT_TRUE(*trees.locate(folder_.path("root")));
    libraries.set({library("org.example.B")});
    EXPECT_EQ(recorded(*store), std::vector<std::string>{"org.example.B"});
    EXPECT_FALSE(*trees.locate(library("org.example.A")));
    EXPECT_TRUE(sink_->lines().empty());
}

TEST_F(ServedLibrariesTest, WhatWasSetBeforeTheStoreWasThereIsToldThen) {
    const auto store = openStore({});
    ServedLibraries libraries(folder_.path("root"));
    native::ServedTrees trees(libraries.rootsWith({}), {});
    libraries.set({library("org.example.A")});
    libraries.attach(*store, trees, {}, log_);
    EXPECT_EQ(recorded(*store), std::vector<std::string>{"org.example.A"});
    EXPECT_TRUE(*trees.locate(library("org.example.A")));
}

}  // namespace
}  // namespace marrowdale::host
