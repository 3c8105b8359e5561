#include <cerrno>
#include <map>
#include <string>

#include <gtest/gtest.h>

#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"

namespace marrowdale {
namespace {

// What a folder without a disk holds, and how it fails.
struct FakeFolder {
    std::uint64_t entries = 0;
    int openError = 0;
    std::optional<Error> walkError{};       // of every walk
    std::optional<Error> subfolderError{};  // told to the handler at the first entry
    std::optional<Error> readError{};  // of the folder itself, told to the handler, then the end
};

class FakeWalk : public DirectoryEnumerator {
  public:
    FakeWalk(DirectoryEnumerationRequest request, const FakeFolder& folder, int& skips)
        : request_(std::move(request)), folder_(folder), skips_(skips) {
        if (!request_.position.levels.empty()) {
            at_ = static_cast<std::uint64_t>(request_.position.levels.front().offset);
        }
    }
    Expected<std::uint64_t> skip(std::uint64_t count) override {
        ++skips_;
        return advance(count);
    }
    Expected<std::uint64_t> next(std::uint64_t limit, std::vector<URL>& urls) override {
        if (folder_.walkError) {
            return Unexpected(*folder_.walkError);
        }
        if (folder_.subfolderError &&
            !request_.errorHandler(request_.url.appendingPathComponent("sub"),
                                   *folder_.subfolderError)) {
            return Unexpected(*folder_.subfolderError);
        }
        if (folder_.readError) {
            return request_.errorHandler(request_.url, *folder_.readError)
                       ? Expected<std::uint64_t>(0)
                       : Unexpected(*folder_.readError);
        }
        const auto first = at_;
        const auto walked = advance(limit);
        for (auto entry = first; entry < at_; ++entry) {
            urls.push_back(request_.url.appendingPathComponent(std::to_string(entry)));
        }
        return walked;
    }
    DirectoryPosition position() const override {
        return {
            .levels = {{.name = "", .folder = FileID{1}, .offset = static_cast<std::int64_t>(at_)}},
            .atEnd = at_ == folder_.entries};
    }

  private:
    std::uint64_t advance(std::uint64_t count) {
        const auto walked = std::min(count, folder_.entries - at_);
        at_ += walked;
        return walked;
    }
    DirectoryEnumerationRequest request_;
    FakeFolder folder_;
    int& skips_;
    std::uint64_t at_ = 0;
};

class FakeFolders : public EmptyFileSystem {
  public:
    std::map<std::string, FakeFolder> folders;
    std::vector<DirectoryEnumerationRequest> requests;
    int skips = 0;

    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override {
        requests.push_back(request);
        const FakeFolder& folder = folders.at(request.url.path());
        if (folder.openError != 0) {
            return Unexpected(errorWithPOSIXCode(folder.openError));
        }
        return std::make_unique<FakeWalk>(request, folder, skips);
    }
};

class FSDirectoryEnumeratorTest : public ::testing::Test {
  protected:
    FSDirectoryEnumerator over(const std::vector<std::string>& paths) {
        FSDirectoryEnumerator request;
        for (const auto& path : paths) {
            request.urls.push_back(URL::fileURL(path));
        }
        request.limit = 200;
        return request;
    }
    Expected<FSDirectoryEnumerator::Result> walk(const FSDirectoryEnumerator& request) {
        collected_.clear();
        return request.enumerate(platform_, collected_);
    }
    std::vector<std::string> paths() const {
        std::vector<std::string> paths;
        for (const URL& url : collected_) {
            paths.push_back(url.path());
        }
        return paths;
    }

    FakePlatform fake_;
    FakeFolders files_;
    Platform platform_ = withFileSystem(fake_.platform, files_);
    std::vector<URL> collected_;
};

TEST_F(FSDirectoryEnumeratorTest, aLimitOf0HandsOutNothing) {
    files_.folders["/a"] = {.entries = 3};
    auto request = over({"/a"});
    request.limit = 0;
    const auto result = walk(request);
    ASSERT_TRUE(result);
    EXPECT_EQ(result->position, 0U);
    EXPECT_TRUE(collected_.empty());
    EXPECT_TRUE(files_.requests.empty());
}

TEST_F(FSDirectoryEnumeratorTest, anEmptyRootListHandsOutNothing) {
    const auto result = walk(over({}));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->position, 0U);
    EXPECT_EQ(result->nextPosition, std::nullopt);
}

TEST_F(FSDirectoryEnumeratorTest, thePositionCounterRunsAcrossAllRoots) {
    files_.folders["/a"] = {.entries = 3};
    files_.folders["/b"] = {.entries = 0};
    files_.folders["/c"] = {.entries = 3};
    auto request = over({"/a", "/b", "/c"});
    request.offset = 2;
    request.limit = 3;
    const auto result = walk(request);
    ASSERT_TRUE(result);
    EXPECT_EQ(paths(), (std::vector<std::string>{"/a/2", "/c/0", "/c/1"}));
    EXPECT_EQ(result->position, 5U);
}

TEST_F(FSDirectoryEnumeratorTest, anOffsetPastTheEndAnswersTheNumberOfEntries) {
    files_.folders["/a"] = {.entries = 3};
    auto request = over({"/a"});
    request.offset = ~0ULL;
    const auto result = walk(request);
    ASSERT_TRUE(result);
    EXPECT_EQ(result->position, 3U);
    EXPECT_TRUE(collected_.empty());
}

TEST_F(FSDirectoryEnumeratorTest, goesOnFromAPositionWithoutWalkingPastAnything) {
    files_.folders["/a"] = {.entries = 3};
    files_.folders["/b"] = {.entries = 5};
    auto request = over({"/a", "/b"});
    request.limit = 4;
    const auto first = walk(request);
    ASSERT_TRUE(first && first->nextPosition);
    EXPECT_EQ(first->nextPosition->root, 1U);
    files_.requests.clear();
    request.offset = first->position;
    request.startPosition = first->nextPosition;
    const auto second = walk(request);
    ASSERT_TRUE(second);
    EXPECT_EQ(paths(), (std::vector<std::string>{"/b/1", "/b/2", "/b/3", "/b/4"}));
    EXPECT_EQ(second->position, 8U);
    EXPECT_EQ(files_.skips, 0);
    EXPECT_EQ(files_.requests.size(), 1U) << "roots that were walked are not opened again";
}

TEST_F(FSDirectoryEnumeratorTest, anOffsetWithoutAPositionGivesTheSamePage) {
    files_.folders["/a"] = {.entries = 3};
    files_.folders["/b"] = {.entries = 5};
    auto request = over({"/a", "/b"});
    request.limit = 4;
    request.offset = 4;
    const auto result = walk(request);
    ASSERT_TRUE(result);
    EXPECT_EQ(paths(), (std::vector<std::string>{"/b/1", "/b/2", "/b/3", "/b/4"}));
    EXPECT_EQ(result->position, 8U);
}

TEST_F(FSDirectoryEnumeratorTest, aRootThatCantBeOpenedIsLoggedAndPassedOver) {
    files_.folders["/a"] = {.openError = EACCES};
    files_.folders["/b"] = {.entries = 1};
    ASSERT_TRUE(walk(over({"/a", "/b"})));
    EXPECT_EQ(paths(), std::vector<std::string>{"/b/0"});
    EXPECT_EQ(fake_.sink->lines(),
              std::vector<std::string>{"[ERROR] can't create file enumerator at /a"});
}

TEST_F(FSDirectoryEnumeratorTest, theDefaultErrorHandlerLogsAndGoesOn) {
    files_.folders["/a"] = {.entries = 1, .subfolderError = errorWithPOSIXCode(EACCES)};
    files_.folders["/b"] = {.entries = 1};
    ASSERT_TRUE(walk(over({"/a", "/b"})));
    EXPECT_EQ(paths(), (std::vector<std::string>{"/a/0", "/b/0"}));
    EXPECT_EQ(fake_.sink->lines(),
              std::vector<std::string>{"[ERROR] can't enumerate /a/sub; " +
                                       errorWithPOSIXCode(EACCES).description()});
}

TEST_F(FSDirectoryEnumeratorTest, anErrorHandlerThatSaysStopEndsTheWalkAndHearsItOnce) {
    files_.folders["/a"] = {.entries = 1, .subfolderError = errorWithPOSIXCode(EACCES)};
    files_.folders["/b"] = {.entries = 1};
    auto request = over({"/a", "/b"});
    std::vector<std::string> heard;
    request.errorHandler = [&](const URL& url, const Error& /*error*/) {
        heard.push_back(url.path());
        return false;
    };
    ASSERT_TRUE(walk(request));
    EXPECT_EQ(heard, std::vector<std::string>{"/a/sub"});
    EXPECT_TRUE(collected_.empty());
    EXPECT_TRUE(fake_.sink->lines().empty());
}

TEST_F(FSDirectoryEnumeratorTest, aRootThatCantBeReadIsToldAndTheNextOneWalked) {
    for (const int code : {ENOTDIR, EACCES, EIO, ENOMEM, ESTALE}) {
        files_.folders["/a"] = {.entries = 1, .readError = errorWithPOSIXCode(code)};
        files_.folders["/b"] = {.entries = 1};
        fake_.sink->clear();
        ASSERT_TRUE(walk(over({"/a", "/b"})));
        EXPECT_EQ(paths(), std::vector<std::string>{"/b/0"});
        EXPECT_EQ(fake_.sink->countContaining("[ERROR] can't enumerate /a; "), 1U);
    }
}

TEST_F(FSDirectoryEnumeratorTest, identifiersThatCantBeMadeDurableEndTheWalkWithTheError) {
    for (const int code : {ENOSPC, EIO, EDQUOT, EROFS, ENOMEM, EMFILE}) {
        files_.folders["/a"] = {.entries = 1, .walkError = errorWithPOSIXCode(code)};
        files_.folders["/b"] = {.entries = 1};
        const auto result = walk(over({"/a", "/b"}));
        ASSERT_FALSE(result);
        EXPECT_EQ(result.error(), errorWithPOSIXCode(code));
    }
}

TEST_F(FSDirectoryEnumeratorTest, defaultOptionsSkipHiddenFilesAndPackages) {
    files_.folders["/a"] = {};
    auto request = over({"/a"});
    ASSERT_TRUE(walk(request));
    request.recursively = true;
    ASSERT_TRUE(walk(request));
    EXPECT_EQ(files_.requests[0].options,
              (DirectoryEnumerationOptions{.skipSubdirectoryDescendants = true,
                                           .skipPackageDescendants = true,
                                           .skipHiddenFiles = true}));
    EXPECT_EQ(files_.requests[1].options,
              (DirectoryEnumerationOptions{.skipSubdirectoryDescendants = false,
                                           .skipPackageDescendants = true,
                                           .skipHiddenFiles = true}));
}

TEST_F(FSDirectoryEnumeratorTest, optionsForARootReplaceTheDefaults) {
    files_.folders["/a"] = {};
    files_.folders["/b"] = {};
    auto request = over({"/a", "/b"});
    request.directoryEnumerationOptionsFor =
        [](const URL& url) -> std::optional<DirectoryEnumerationOptions> {
        if (url.path() == "/b") {
            return DirectoryEnumerationOptions{};
        }
        return std::nullopt;
    };
    ASSERT_TRUE(walk(request));
    EXPECT_TRUE(files_.requests[0].options.skipHiddenFiles);
    EXPECT_EQ(files_.requests[1].options, DirectoryEnumerationOptions{});
}

TEST_F(FSDirectoryEnumeratorTest, asksForTheKeysAndAttributesItWasGiven) {
    files_.folders["/a"] = {};
    auto request = over({"/a"});
    request.keys = {ResourceKey::isWritable};
    request.attributeNames = {"com.quillory.trash.time#PS"};
    ASSERT_TRUE(walk(request));
    EXPECT_TRUE(files_.requests[0].keys.contains(ResourceKey::isWritable));
    EXPECT_EQ(files_.requests[0].attributeNames, request.attributeNames);
    EXPECT_TRUE(files_.requests[0].prefetchStatus);
}

}  // namespace
}  // namespace marrowdale
