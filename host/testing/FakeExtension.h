#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// An item that is what a test says it is.
class FakeItem final : public FileProviderItem {
  public:
    explicit FakeItem(std::string_view identifier, std::string_view path = "/root/item")
        : FileProviderItem(URL::fileURL(path)) {
        itemIdentifier = identifier;
        filename = fileURL.lastPathComponent();
    }
    bool folder = false;
    bool container = false;
    [[nodiscard]] bool hx_isContainer() const override { return container; }
    [[nodiscard]] bool isFolder() const override { return folder; }
    [[nodiscard]] std::string description() const override { return itemIdentifier; }
};

// What one request for a page is answered with.
struct FakeAnswer {
    std::vector<std::string> identifiers;
    std::optional<Data> nextPage;
    std::optional<Error> error;  // wins over the rest
};

// What one request for changes is answered with.
struct FakeChanges {
    std::vector<std::string> updated;
    std::vector<std::string> deleted;
    Data anchor;
    MoreComing moreComing = MoreComing::no;
    std::optional<Error> error;  // in place of a finish with the anchor
};

// Answers one page after the other from a list, and remembers which pages were asked for. Requests
// for changes are answered on the thread that asks.
class FakeEnumerator final : public FileProviderEnumerator {
  public:
    struct Record {
        std::vector<Data> pages;
        std::vector<Data> anchors;  // that changes were asked for
        std::vector<FakeChanges> changes;
        std::optional<Data> currentAnchor;
        // Observers of requests behind the last of `changes`, for a test to answer.
        std::vector<std::shared_ptr<FileProviderChangeObserver>> waiting;
        int starts = 0;
        int stops = 0;
        bool isInvalidated = false;
    };
    FakeEnumerator(std::vector<FakeAnswer> answers, Record& record)
        : answers_(std::move(answers)), record_(record) {}

    void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                   const Data& page) override {
        const FakeAnswer& answer = answers_.at(record_.pages.size());
        record_.pages.push_back(page);
        if (answer.error) {
            observer.finishEnumeratingWithError(*answer.error);
            return;
        }
        observer.didEnumerateItems(items(answer.identifiers));
        observer.finishEnumeratingUpToPage(answer.nextPage);
    }
    void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                     const Data& anchor) override {
        record_.anchors.push_back(anchor);
        if (record_.anchors.size() > record_.changes.size()) {
            record_.waiting.push_back(std::move(observer));
            return;
        }
        const FakeChanges changes = record_.changes[record_.anchors.size() - 1];
        if (!changes.deleted.empty()) {
            observer->didDeleteItemsWithIdentifiers(changes.deleted);
        }
        if (!changes.updated.empty()) {
            observer->didUpdateItems(items(changes.updated));
        }
        if (changes.error) {
            observer->finishEnumeratingWithError(*changes.error);
        } else {
            observer->finishEnumeratingChangesUpToSyncAnchor(changes.anchor, changes.moreComing);
        }
    }
    void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) override {
        completionHandler(record_.currentAnchor);
    }
    void start() override { ++record_.starts; }
    void stop() override {
        ++record_.stops;
        record_.waiting.clear();
    }
    void invalidate() override {
        record_.isInvalidated = true;
        record_.waiting.clear();
    }

  private:
    static std::vector<FileProviderItemPtr> items(const std::vector<std::string>& identifiers) {
        std::vector<FileProviderItemPtr> made;
        for (const std::string& identifier : identifiers) {
            made.push_back(std::make_shared<FakeItem>(identifier));
        }
        return made;
    }

    std::vector<FakeAnswer> answers_;
    Record& record_;
};

// An extension that knows the items a test gave it.
class FakeExtension : public FileProviderExtension {
  public:
    std::map<std::string, std::shared_ptr<FakeItem>, std::less<>> items;
    std::vector<std::string> askedPaths;
    std::vector<std::string> enumerated;
    FakeEnumerator::Record record;

    FakeItem& add(std::string_view identifier, std::string_view path) {
        auto item = std::make_shared<FakeItem>(identifier, path);
        items[std::string(identifier)] = item;
        return *item;
    }

    [[nodiscard]] std::optional<URL> URLForItemWithPersistentIdentifier(
        std::string_view itemIdentifier) override {
        const auto found = items.find(itemIdentifier);
        return found == items.end() ? std::nullopt : std::optional(found->second->fileURL);
    }
    [[nodiscard]] std::optional<std::string> persistentIdentifierForItemAtURL(
        const URL& url) override {
        askedPaths.push_back(url.path());
        for (const auto& [identifier, item] : items) {
            if (item->fileURL == url) {
                return identifier;
            }
        }
        return std::nullopt;
    }
    [[nodiscard]] Expected<FileProviderItemPtr> itemForIdentifier(
        std::string_view itemIdentifier) override {
        const auto found = items.find(itemIdentifier);
        if (found == items.end()) {
            return Unexpected(errorForNonExistentItem(itemIdentifier));
        }
        return FileProviderItemPtr(found->second);
    }
    [[nodiscard]] Expected<std::unique_ptr<FileProviderEnumerator>>
    enumeratorForContainerItemIdentifier(std::string_view containerItemIdentifier) override {
        enumerated.emplace_back(containerItemIdentifier);
        return std::unique_ptr<FileProviderEnumerator>(
            std::make_unique<FakeEnumerator>(std::vector<FakeAnswer>{}, record));
    }
    void providePlaceholderAtURL(const URL& /*url*/, CompletionHandler handler) override {
        handler({});
    }
    void startProvidingItemAtURL(const URL& /*url*/, CompletionHandler handler) override {
        handler({});
    }
    void stopProvidingItemAtURL(const URL& /*url*/) override {}
    void itemChangedAtURL(const URL& /*url*/) override {}

    // Refreshes are done at once.
    void _refreshInstalledAppsWithCompletionHandler(std::function<void()> handler) override {
        ++refreshes;
        if (handler) {
            refreshHandlers.push_back(std::move(handler));
        }
        for (const auto& each : refreshHandlers) {
            each();
        }
    }
    void _defaultApplicationContainerForBundleIdentifier(
        std::string_view bundleIdentifier,
        std::function<void(Expected<FileProviderItemPtr>)> handler) override {
        const auto found = items.find("#" + std::string(bundleIdentifier));
        if (found == items.end()) {
            handler(Unexpected(errorInvalidParameter("bundleIdentifier", bundleIdentifier)));
            return;
        }
        handler(FileProviderItemPtr(found->second));
    }
    std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& identifiers, ThumbnailSize /*size*/,
        const TypedThumbnailHandler& perThumbnail,
        const std::function<void(const std::optional<Error>&)>& handler) override {
        for (const std::string& identifier : identifiers) {
            perThumbnail(identifier, {}, {}, {});
        }
        handler({});
        return std::make_unique<Progress>();
    }
    // A library's thumbnail is its identifier.
    std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& identifiers, ThumbnailSize /*size*/,
        const ThumbnailHandler& perThumbnail,
        const std::function<void(const std::optional<Error>&)>& handler) override {
        for (const std::string& identifier : identifiers) {
            perThumbnail(identifier,
                         identifier.starts_with('#') ? std::optional(Data::fromText(identifier))
                                                     : std::nullopt,
                         {});
        }
        handler({});
        return std::make_unique<Progress>();
    }

    int refreshes = 0;
    std::vector<std::function<void()>> refreshHandlers;
};

}  // namespace marrowdale::host
