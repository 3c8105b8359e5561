#pragma once

#include <functional>
#include <initializer_list>
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

    // What was asked of it, a line each; answered with `actionError` or the item `actionItem`.
    std::vector<std::string> actions;
    std::optional<Error> actionError;
    std::string actionItem;

    void importDocumentAtURL(const URL& url, std::string_view toParentItemIdentifier,
                             ItemCompletionHandler handler) override {
        act({"import", url.path(), toParentItemIdentifier}, handler);
    }
    void createDirectoryWithName(std::string_view name, std::string_view inParentItemIdentifier,
                                 ItemCompletionHandler handler) override {
        act({"create", name, inParentItemIdentifier}, handler);
    }
    void renameItemWithIdentifier(std::string_view itemIdentifier, std::string_view toName,
                                  ItemCompletionHandler handler) override {
        act({"rename", itemIdentifier, toName}, handler);
    }
    void reparentItemWithIdentifier(std::string_view itemIdentifier,
                                    std::string_view toParentItemWithIdentifier,
                                    std::optional<std::string> newName,
                                    ItemCompletionHandler handler) override {
        act({"move", itemIdentifier, toParentItemWithIdentifier, newName.value_or("-")}, handler);
    }
    void trashItemWithIdentifier(std::string_view itemIdentifier,
                                 ItemCompletionHandler handler) override {
        act({"trash", itemIdentifier}, handler);
    }
    void untrashItemWithIdentifier(std::string_view itemIdentifier,
                                   std::optional<std::string> toParentItemIdentifier,
                                   ItemCompletionHandler handler) override {
        act({"untrash", itemIdentifier, toParentItemIdentifier.value_or("-")}, handler);
    }
    void deleteItemWithIdentifier(std::string_view itemIdentifier,
                                  ErrorCompletionHandler handler) override {
        note({"delete", itemIdentifier});
        handler(actionError);
    }
    void setLastUsedDate(std::optional<Date> date, std::string_view forItemIdentifier,
                         ItemCompletionHandler handler) override {
        act({"used", forItemIdentifier, date ? date->rfc3339() : "-"}, handler);
    }
    void setTagData(std::optional<Data> tagData, std::string_view forItemIdentifier,
                    ItemCompletionHandler handler) override {
        lastTagData = std::move(tagData);
        act({"tag", forItemIdentifier}, handler);
    }
    void setFavoriteRank(std::optional<Number> rank, std::string_view forItemIdentifier,
                         ItemCompletionHandler handler) override {
        lastRank = rank;
        act({"favorite", forItemIdentifier}, handler);
    }
    void _removeTrashedItemsOlderThanDate(const Date& date,
                                          std::function<void()> handler) override {
        note({"purge", date.rfc3339()});
        handler();
    }
    std::optional<Data> lastTagData;
    std::optional<Number> lastRank;

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

  private:
    void note(std::initializer_list<std::string_view> words) {
        std::string line;
        for (const std::string_view word : words) {
            line.append(line.empty() ? "" : " ").append(word);
        }
        actions.push_back(std::move(line));
    }
    void act(std::initializer_list<std::string_view> words, const ItemCompletionHandler& handler) {
        note(words);
        if (actionError) {
            handler(Unexpected(*actionError));
        } else {
            handler(itemForIdentifier(actionItem));
        }
    }
};

}  // namespace marrowdale::host
