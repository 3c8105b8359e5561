#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale {

class AppRefresh;

// The object that the host makes and calls: every request enters here. Keeps no state that changes,
// but for the refreshes of app libraries; every look-up builds fresh records.
class LocalFileProvider : public FileProviderExtension {
  public:
    // Begins with a refresh of the app libraries, and asks the host to read the working set again,
    // for what changed while nothing ran. The platform lives longer than the provider and all that
    // it hands out.
    explicit LocalFileProvider(const Platform& platform);
    LocalFileProvider(const LocalFileProvider&) = delete;
    LocalFileProvider& operator=(const LocalFileProvider&) = delete;
    // Waits for a refresh that is running, and for what enumerators that are gone left behind on
    // queues, so that nothing of this module runs any more. The host has released its enumerators.
    ~LocalFileProvider() override;

    std::optional<URL> URLForItemWithPersistentIdentifier(
        std::string_view itemIdentifier) noexcept override;
    std::optional<std::string> persistentIdentifierForItemAtURL(const URL& url) noexcept override;
    // The host framework's error for an item that does not exist.
    Expected<FileProviderItemPtr> itemForIdentifier(
        std::string_view itemIdentifier) noexcept override;
    // The enumerator owns its notifier, which is bound to it for as long as it lives.
    Expected<std::unique_ptr<FileProviderEnumerator>> enumeratorForContainerItemIdentifier(
        std::string_view containerItemIdentifier) noexcept override;

    // Everything is on this device: there is nothing to provide, and nothing to give back.
    void providePlaceholderAtURL(const URL& url,
                                 CompletionHandler completionHandler) noexcept override;
    void startProvidingItemAtURL(const URL& url,
                                 CompletionHandler completionHandler) noexcept override;
    void stopProvidingItemAtURL(const URL& url) noexcept override;
    void itemChangedAtURL(const URL& url) noexcept override;

    void _refreshInstalledAppsWithCompletionHandler(
        std::function<void()> completionHandler) noexcept override;
    // The completion handler is called before it returns.
    void _defaultApplicationContainerForBundleIdentifier(
        std::string_view bundleIdentifier,
        std::function<void(Expected<FileProviderItemPtr>)> completionHandler) noexcept override;
    std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& itemIdentifiers, ThumbnailSize requestedSize,
        const TypedThumbnailHandler& perThumbnailCompletionHandlerWithType,
        const std::function<void(const std::optional<Error>&)>& completionHandler) noexcept
        override;
    std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& itemIdentifiers, ThumbnailSize requestedSize,
        const ThumbnailHandler& perThumbnailCompletionHandler,
        const std::function<void(const std::optional<Error>&)>& completionHandler) noexcept
        override;
    // The icon that suits this device's screen best.
    [[nodiscard]] std::optional<Data> bestIconData(const BundleRecord& record) const;
    // Actions: see providers/marrowdale/actions.
    void importDocumentAtURL(const URL& url, std::string_view toParentItemIdentifier,
                             ItemCompletionHandler completionHandler) noexcept override;
    void createDirectoryWithName(std::string_view name, std::string_view inParentItemIdentifier,
                                 ItemCompletionHandler completionHandler) noexcept override;
    void renameItemWithIdentifier(std::string_view itemIdentifier, std::string_view toName,
                                  ItemCompletionHandler completionHandler) noexcept override;
    void reparentItemWithIdentifier(std::string_view itemIdentifier,
                                    std::string_view toParentItemWithIdentifier,
                                    std::optional<std::string> newName,
                                    ItemCompletionHandler completionHandler) noexcept override;
    void trashItemWithIdentifier(std::string_view itemIdentifier,
                                 ItemCompletionHandler completionHandler) noexcept override;
    void untrashItemWithIdentifier(std::string_view itemIdentifier,
                                   std::optional<std::string> toParentItemIdentifier,
                                   ItemCompletionHandler completionHandler) noexcept override;
    void deleteItemWithIdentifier(std::string_view itemIdentifier,
                                  ErrorCompletionHandler completionHandler) noexcept override;
    void setLastUsedDate(std::optional<Date> date, std::string_view forItemIdentifier,
                         ItemCompletionHandler completionHandler) noexcept override;
    void setTagData(std::optional<Data> tagData, std::string_view forItemIdentifier,
                    ItemCompletionHandler completionHandler) noexcept override;
    void setFavoriteRank(std::optional<Number> rank, std::string_view forItemIdentifier,
                         ItemCompletionHandler completionHandler) noexcept override;
    void _removeTrashedItemsOlderThanDate(
        const Date& date, std::function<void()> completionHandler) noexcept override;

    // The item at a URL that an action holds. Fails with invalidItemURL when it has no identifier,
    // with itemNotFound when it has one and can't be served.
    [[nodiscard]] Expected<FileProviderItemPtr> itemForURL(const URL& url);

    // The two look-ups without their log sections, for use within other requests.
    [[nodiscard]] Expected<URL> _urlForItemWithPersistentIdentifier(
        std::string_view itemIdentifier);
    [[nodiscard]] std::optional<std::string> _persistentIdentifierForItemAt(const URL& url);

  private:
    const Platform& platform_;
    const std::shared_ptr<AppRefresh> appRefresh_;
};

}  // namespace marrowdale
