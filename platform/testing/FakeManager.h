#pragma once

#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderManager.h"

namespace marrowdale {

// A host that only remembers what it was told. Any thread.
class FakeManager : public FileProviderManager {
  public:
    explicit FakeManager(std::string_view storageRoot) : root_(URL::fileURL(storageRoot)) {}

    [[nodiscard]] const URL& documentStorageURL() const override { return root_; }
    void signalEnumeratorForContainerItemIdentifier(
        std::string_view containerItemIdentifier,
        std::function<void(const std::optional<Error>&)> completionHandler) override {
        {
            const std::lock_guard lock(mutex_);
            signalled_.emplace_back(containerItemIdentifier);
        }
        if (completionHandler) {
            completionHandler(std::nullopt);
        }
    }
    // Answered at once, with what `deletionFault` says.
    void deleteIndexedItemsInDomains(
        std::vector<std::string> domainIdentifiers,
        std::function<void(const std::optional<Error>&)> completionHandler) override {
        {
            const std::lock_guard lock(mutex_);
            deletedDomains_.push_back(std::move(domainIdentifiers));
        }
        if (completionHandler) {
            completionHandler(deletionFault);
        }
    }
    // Set between calls.
    std::optional<Error> deletionFault;

    // Each request's domains.
    [[nodiscard]] std::vector<std::vector<std::string>> deletedDomains() const {
        const std::lock_guard lock(mutex_);
        return deletedDomains_;
    }
    [[nodiscard]] std::vector<std::string> signalled() const {
        const std::lock_guard lock(mutex_);
        return signalled_;
    }

  private:
    URL root_;
    mutable std::mutex mutex_;
    std::vector<std::string> signalled_;                    // guarded by mutex_
    std::vector<std::vector<std::string>> deletedDomains_;  // guarded by mutex_
};

}  // namespace marrowdale
