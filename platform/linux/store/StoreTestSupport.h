#pragma once

#include <chrono>
#include <fcntl.h>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/Store.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {

// Documents by the names of one folder's entries.
using Documents = std::map<std::string, DocumentID>;

// Requests for the entries of one folder, and the strings that they look at.
struct FolderRequests {
    std::unique_ptr<std::string> folderPath;
    std::vector<std::unique_ptr<std::string>> names;
    std::vector<DocumentIndex::Request> requests;
};

inline FolderRequests makeRequests(const std::string& folder) {
    FolderRequests made;
    made.folderPath = std::make_unique<std::string>(folder);
    auto opened = openFolder(folder);
    if (!opened) {
        ADD_FAILURE() << opened.error().description();
        return made;
    }
    const auto folderID = statEntry(opened->get(), "")->fileID;
    DirectoryReader reader(std::move(*opened), 8192);
    while (true) {
        const auto entry = reader.next();
        if (!entry || !*entry) {
            break;
        }
        const auto status = statEntry(reader.descriptor(), (*entry)->cName());
        if (status) {
            made.names.push_back(std::make_unique<std::string>((*entry)->name));
            made.requests.push_back({folderID, *made.folderPath, *made.names.back(), *status, {}});
        }
    }
    return made;
}

// A fresh root, state and cache folder on one of the test file systems.
template <typename Parameter>
class StoreTestBaseOf : public testing::TestWithParam<Parameter> {
  protected:
    explicit StoreTestBaseOf(const TestFileSystem& fileSystem)
        : directory_(fileSystem.dir), root_(directory_.path() + "/root") {
        makeFolder(root_);
        state_ = directory_.path() + "/state";
        cache_ = directory_.path() + "/cache";
    }

    [[nodiscard]] const std::string& root() const { return root_; }
    [[nodiscard]] const std::string& state() const { return state_; }
    [[nodiscard]] const std::string& cache() const { return cache_; }
    // Where the one store of a state folder lies.
    [[nodiscard]] static std::string storeIn(const std::string& state) {
        std::string found;
        for (const auto& entry : std::filesystem::directory_iterator(state)) {
            if (entry.path().filename().string().starts_with("store-")) {
                EXPECT_EQ(found, "") << "another store lies beside it";
                found = entry.path();
            }
        }
        return found;
    }
    // Where it is put when it is set aside.
    [[nodiscard]] static std::string damagedFor(const std::string& store) {
        const std::filesystem::path path(store);
        return path.parent_path().string() + "/damaged-" +
               path.filename().string().substr(std::string_view("store-").size());
    }
    [[nodiscard]] std::string path(const std::string& below) const {
        return below.empty() ? root_ : root_ + "/" + below;
    }
    void setRoot(const std::string& path) {
        root_ = path;
        makeFolder(root_);
    }
    void setState(const std::string& path) { state_ = path; }
    void setCache(const std::string& path) { cache_ = path; }

    void write(const std::string& below, const std::string& contents = "x") {
        makeFolder(std::filesystem::path(path(below)).parent_path());
        writeFile(path(below), contents);
    }
    void rename(const std::string& from, const std::string& to) {
        std::filesystem::rename(path(from), path(to));
    }
    void link(const std::string& from, const std::string& to) {
        std::filesystem::create_hard_link(path(from), path(to));
    }
    void remove(const std::string& below) { std::filesystem::remove_all(path(below)); }
    [[nodiscard]] EntryStatus status(const std::string& below) const {
        return *statEntry(AT_FDCWD, path(below).c_str());
    }
    [[nodiscard]] DeviceID device() const { return status("").device; }
    // Waits until what was written so far is too old to be unsure.
    void settle() const {
        const Date before = Date::now();
        (void)waitUntil([&] {
            const Date now = Date::now();
            return now.seconds > before.seconds + 1 ||
                   (now.seconds - before.seconds) * 1'000'000'000LL + now.nanoseconds -
                           before.nanoseconds >
                       15'000'000LL;
        });
    }

    [[nodiscard]] virtual StoreOptions options() const {
        StoreOptions options;
        options.stateFolder = state_;
        options.cacheFolder = cache();
        options.rootPath = root_;
        return options;
    }
    [[nodiscard]] Expected<std::unique_ptr<Store>> tryOpen() { return Store::open(options()); }
    void open() {
        auto opened = tryOpen();
        ASSERT_TRUE(opened) << opened.error().description();
        store_ = std::move(*opened);
    }
    void close() { store_.reset(); }
    void reopen() {
        close();
        open();
    }
    [[nodiscard]] Store& store() { return *store_; }

    [[nodiscard]] FolderRequests requestsFor(const std::string& folder) const {
        return makeRequests(path(folder));
    }
    Documents assign(FolderRequests& folder) {
        const auto done = store_->assignDocumentIDs(folder.requests);
        EXPECT_TRUE(done) << done.error().description();
        Documents documents;
        for (const auto& request : folder.requests) {
            documents.emplace(request.name, request.document);
        }
        return documents;
    }
    Documents assign(const std::string& folder) {
        auto requests = requestsFor(folder);
        return assign(requests);
    }
    // Below the root; what went wrong instead.
    [[nodiscard]] std::string pathOf(FileID file) {
        const auto found = store_->pathForFileID(device(), file);
        return found ? std::filesystem::path(*found).lexically_relative(root_).string()
                     : found.error().description();
    }
    [[nodiscard]] std::string pathOf(DocumentID document) {
        const auto file = store_->resolveDocumentID(document, device());
        return file ? pathOf(*file) : file.error().description();
    }

  private:
    TemporaryDirectory directory_;
    std::string root_;
    std::string state_;
    std::string cache_;
    std::unique_ptr<Store> store_;
};

class StoreTestBase : public StoreTestBaseOf<TestFileSystem> {
  protected:
    StoreTestBase() : StoreTestBaseOf(GetParam()) {}
};

}  // namespace marrowdale::native
