#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/ResourceValue.h"
#include "platform/foundation/URL.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

// Hears how an action ended, once: the item as it is now, or why there is none. On any thread, also
// before the call returns.
using ItemCompletionHandler = std::function<void(Expected<FileProviderItemPtr> item)>;
// Hears that an action ended, once; none for success.
using ErrorCompletionHandler = std::function<void(const std::optional<Error>& error)>;

// What a host has done to items. Every call returns once the work was handed to the platform or
// refused. Any thread, several at once.
class FileProviderItemActions {
  public:
    virtual ~FileProviderItemActions() = default;

    // Brings a copy of the document into the folder, under its own name.
    virtual void importDocumentAtURL(const URL& url, std::string_view toParentItemIdentifier,
                                     ItemCompletionHandler completionHandler) = 0;
    virtual void createDirectoryWithName(std::string_view name,
                                         std::string_view inParentItemIdentifier,
                                         ItemCompletionHandler completionHandler) = 0;
    virtual void renameItemWithIdentifier(std::string_view itemIdentifier, std::string_view toName,
                                          ItemCompletionHandler completionHandler) = 0;
    // `newName`: none keeps the name.
    virtual void reparentItemWithIdentifier(std::string_view itemIdentifier,
                                            std::string_view toParentItemWithIdentifier,
                                            std::optional<std::string> newName,
                                            ItemCompletionHandler completionHandler) = 0;
    virtual void trashItemWithIdentifier(std::string_view itemIdentifier,
                                         ItemCompletionHandler completionHandler) = 0;
    // `toParentItemIdentifier`: none, or one that can't be used, leaves the place to the provider.
    virtual void untrashItemWithIdentifier(std::string_view itemIdentifier,
                                           std::optional<std::string> toParentItemIdentifier,
                                           ItemCompletionHandler completionHandler) = 0;
    virtual void deleteItemWithIdentifier(std::string_view itemIdentifier,
                                          ErrorCompletionHandler completionHandler) = 0;
};

// What a host keeps with items, and the purge of the trash. Any thread, several at once.
class FileProviderMetadataActions {
  public:
    virtual ~FileProviderMetadataActions() = default;

    // No date, data or rank clears what was set.
    virtual void setLastUsedDate(std::optional<Date> date, std::string_view forItemIdentifier,
                                 ItemCompletionHandler completionHandler) = 0;
    // `tagData`: see FileProviderItem::tagData.
    virtual void setTagData(std::optional<Data> tagData, std::string_view forItemIdentifier,
                            ItemCompletionHandler completionHandler) = 0;
    virtual void setFavoriteRank(std::optional<Number> rank, std::string_view forItemIdentifier,
                                 ItemCompletionHandler completionHandler) = 0;
    // Deletes what was trashed before the date; the handler is called when every deletion that
    // this call began has ended, well or not.
    virtual void _removeTrashedItemsOlderThanDate(const Date& date,
                                                  std::function<void()> completionHandler) = 0;
};

}  // namespace marrowdale
