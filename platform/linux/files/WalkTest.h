#pragma once

#include <cstdint>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/linux/files/LinuxFilesTestWorld.h"

namespace marrowdale::native {

inline constexpr DirectoryEnumerationOptions flat{
    .skipSubdirectoryDescendants = true, .skipPackageDescendants = true, .skipHiddenFiles = true};
inline constexpr DirectoryEnumerationOptions deep{
    .skipSubdirectoryDescendants = false, .skipPackageDescendants = true, .skipHiddenFiles = true};

using Names = std::multiset<std::string>;

// The base of the tests of walks, on every file system: a world, and shorthands to make entries in
// its folder and to list them. What the walks' error handler is told is in `errors_`.
class WalkTest : public OnEachFileSystem {
  protected:
    [[nodiscard]] DirectoryEnumerationRequest request(DirectoryEnumerationOptions options) {
        DirectoryEnumerationRequest result{.url = world_.url(),
                                           .keys = everyKey,
                                           .attributeNames = {"one", "two"},
                                           .options = options,
                                           .position = {},
                                           .errorHandler = {}};
        result.errorHandler = [this](const URL& url, const Error& error) {
            errors_.emplace_back(url.path(), error.code);
            return goOn_;
        };
        return result;
    }
    [[nodiscard]] std::unique_ptr<DirectoryEnumerator> walk(
        const DirectoryEnumerationRequest& wanted) {
        auto opened = world_.files.enumerateDirectory(wanted);
        EXPECT_TRUE(opened) << opened.error().description();
        return opened ? std::move(*opened) : nullptr;
    }
    [[nodiscard]] std::string relative(const URL& url) const {
        return url.path().substr(world_.folder.path().size() + 1);
    }
    [[nodiscard]] Names namesOf(const std::vector<URL>& urls) const {
        Names names;
        for (const URL& url : urls) {
            names.insert(relative(url));
        }
        return names;
    }
    [[nodiscard]] Names list(DirectoryEnumerationOptions options, std::uint64_t limit = 100000) {
        return namesOf(listURLs(options, limit));
    }
    [[nodiscard]] std::vector<URL> listURLs(DirectoryEnumerationOptions options,
                                            std::uint64_t limit = 100000) {
        std::vector<URL> urls;
        const auto walking = walk(request(options));
        while (true) {
            const auto walked = walking->next(limit, urls);
            EXPECT_TRUE(walked) << walked.error().description();
            if (!walked || *walked < limit) {
                return urls;
            }
        }
    }
    [[nodiscard]] URL listed(const std::string& name, DirectoryEnumerationOptions options = flat) {
        for (const URL& url : listURLs(options)) {
            if (relative(url) == name) {
                return url;
            }
        }
        ADD_FAILURE() << name << " is not listed";
        return world_.url();
    }
    void file(const std::string& name, std::string_view contents = {}) const {
        writeFile(world_.at(name), contents);
    }
    void folder(const std::string& name) const { makeFolder(world_.at(name)); }

    std::vector<std::pair<std::string, int>> errors_;
    bool goOn_ = true;
};

}  // namespace marrowdale::native
