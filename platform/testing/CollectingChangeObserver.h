#pragma once

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/Mutex.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale {

// Keeps what one request for changes brought, and does what a test wants done within a call. Any
// thread.
class CollectingChangeObserver : public FileProviderChangeObserver {
  public:
    // Called at the end of each call, with its line; set before the request.
    std::function<void(const std::string& line)> within;

    void didUpdateItems(std::vector<FileProviderItemPtr> items) override {
        std::string line = "update";
        for (const auto& item : items) {
            line += " " + item->filename;
        }
        {
            const MutexLock lock(mutex_);
            updates_.insert(updates_.end(), items.begin(), items.end());
        }
        note(std::move(line));
    }
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override {
        std::string line = "delete";
        for (const auto& identifier : identifiers) {
            line += " " + identifier;
        }
        {
            const MutexLock lock(mutex_);
            deletions_.insert(deletions_.end(), identifiers.begin(), identifiers.end());
        }
        note(std::move(line));
    }
    void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) override {
        {
            const MutexLock lock(mutex_);
            anchor_ = std::move(anchor);
        }
        note(moreComing == MoreComing::yes ? "finish, more" : "finish");
    }
    void finishEnumeratingWithError(const Error& error) override {
        {
            const MutexLock lock(mutex_);
            error_ = error;
        }
        note("error " + std::to_string(error.code));
    }

    // One line a call: "update NAME …", "delete IDENTIFIER …", "finish", "finish, more",
    // "error CODE".
    [[nodiscard]] std::vector<std::string> calls() const {
        const MutexLock lock(mutex_);
        return calls_;
    }
    [[nodiscard]] std::vector<FileProviderItemPtr> updates() const {
        const MutexLock lock(mutex_);
        return updates_;
    }
    [[nodiscard]] std::vector<std::string> deletions() const {
        const MutexLock lock(mutex_);
        return deletions_;
    }
    [[nodiscard]] std::optional<Data> anchor() const {
        const MutexLock lock(mutex_);
        return anchor_;
    }
    [[nodiscard]] std::optional<Error> error() const {
        const MutexLock lock(mutex_);
        return error_;
    }
    [[nodiscard]] std::size_t finishes() const {
        const MutexLock lock(mutex_);
        std::size_t count = 0;
        for (const auto& call : calls_) {
            count += call.starts_with("finish") || call.starts_with("error") ? 1U : 0U;
        }
        return count;
    }
    [[nodiscard]] bool waitForFinish() const {
        return waitUntil([this] { return finishes() > 0; });
    }

  private:
    void note(std::string line) {
        {
            const MutexLock lock(mutex_);
            calls_.push_back(line);
        }
        if (within) {
            within(line);
        }
    }

    mutable Mutex mutex_;
    std::vector<std::string> calls_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<FileProviderItemPtr> updates_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<std::string> deletions_ MARROWDALE_GUARDED_BY(mutex_);
    std::optional<Data> anchor_ MARROWDALE_GUARDED_BY(mutex_);
    std::optional<Error> error_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale
