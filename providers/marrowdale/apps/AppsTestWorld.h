#pragma once

#include <algorithm>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {

// Keeps what one request for changes brought, in the order in which it came: "update ID…", "delete
// ID…", "finish", "error CODE". Any thread.
class RecordingChangeObserver : public FileProviderChangeObserver {
  public:
    void didUpdateItems(std::vector<FileProviderItemPtr> items) override {
        std::string call = "update";
        for (const auto& item : items) {
            call += " " + item->itemIdentifier;
        }
        add(call);
    }
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override {
        std::string call = "delete";
        for (const auto& identifier : identifiers) {
            call += " " + identifier;
        }
        add(call);
    }
    void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing /*moreComing*/) override {
        add("finish");
        const std::lock_guard lock(mutex_);
        anchor_ = std::move(anchor);
    }
    void finishEnumeratingWithError(const Error& error) override {
        add("error " + std::to_string(error.code));
    }
    [[nodiscard]] std::vector<std::string> calls() const {
        const std::lock_guard lock(mutex_);
        return calls_;
    }
    [[nodiscard]] bool isFinished() const {
        const auto all = calls();
        return !all.empty() && (all.back() == "finish" || all.back().starts_with("error"));
    }
    [[nodiscard]] std::optional<Data> anchor() const {
        const std::lock_guard lock(mutex_);
        return anchor_;
    }

  private:
    void add(std::string call) {
        const std::lock_guard lock(mutex_);
        calls_.push_back(std::move(call));
    }
    mutable std::mutex mutex_;
    std::vector<std::string> calls_;  // guarded by mutex_
    std::optional<Data> anchor_;      // guarded by mutex_
};

// A world with applications whose libraries are real folders, and the caches they are kept in.
class AppsTestWorld : public ::testing::Test {
  protected:
    using Lines = std::vector<std::string>;
    using Bump = LocalAppLibraryCache::Bump;
    using Changed = LocalAppLibraryManager::Changed;
    using Searchable = LocalAppLibraryManager::Searchable;
    using Source = LocalAppLibraryCacheSource;

    // An application org.example.NAME whose library is there.
    std::shared_ptr<FakeBundleRecord> add(const std::string& name) {
        makeFolder(library(name));
        return world_.applications.add("org.example." + name, name, world_.path("apps/" + name));
    }
    // The folder of its documents: where the store records what happens.
    std::string library(const std::string& name) const {
        return world_.path("apps/" + name + "/Documents");
    }
    void remove(const std::string& name) { world_.applications.remove("org.example." + name); }
    Changed refresh() {
        auto changed = Changed::no;
        LocalAppLibraryManager::backgroundQueue(world_.platform).sync([&] {
            changed = LocalAppLibraryManager::refreshAppLibraries(world_.platform);
        });
        return changed;
    }
    LocalAppLibraryCache& cache(Source source = Source::main) {
        return LocalAppLibraryCache::of(world_.platform, source);
    }
    std::uint64_t token(Source source = Source::main) {
        std::uint64_t token = 0;
        cache(source).queue().sync([&] { token = cache(source).versionToken(); });
        return token;
    }
    std::vector<std::string> cached(Source source = Source::main) {
        std::vector<std::string> identifiers;
        cache(source).queue().sync([&] {
            for (const auto& record : cache(source).load()) {
                identifiers.push_back(record->bundleIdentifier().value_or("none"));
            }
        });
        return identifiers;
    }
    static std::vector<std::string> identifiers(const LocalAppLibraryManager& manager) {
        std::vector<std::string> found;
        for (const auto& item : manager.items()) {
            found.push_back(item->itemIdentifier);
        }
        return found;
    }
    std::size_t count(const std::string& line) const { return world_.sink->count(line); }
    std::size_t countContaining(const std::string& text) const {
        return world_.sink->countContaining(text);
    }
    std::string mainFile() const { return directory_.path("data/Marrowdale/app-libraries.plist"); }

    static native::StoreOptions listening() {
        native::StoreOptions options;
        options.recording = native::StoreOptions::Recording::live;
        return options;
    }

    TemporaryDirectory directory_;
    TestWorld world_{directory_, listening()};
};

}  // namespace marrowdale
