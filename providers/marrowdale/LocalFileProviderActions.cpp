#include <utility>

#include "providers/marrowdale/LocalFileProvider.h"
#include "providers/marrowdale/actions/ItemActions.h"
#include "providers/marrowdale/actions/MetadataActions.h"
#include "providers/marrowdale/actions/TrashActions.h"
#include "providers/marrowdale/actions/TrashPurge.h"

// The host's names of the actions.

namespace marrowdale {

void LocalFileProvider::importDocumentAtURL(const URL& url, std::string_view toParentItemIdentifier,
                                            ItemCompletionHandler completionHandler) noexcept {
    importDocument(platform_, url, toParentItemIdentifier, std::move(completionHandler));
}

void LocalFileProvider::createDirectoryWithName(std::string_view name,
                                                std::string_view inParentItemIdentifier,
                                                ItemCompletionHandler completionHandler) noexcept {
    createDirectory(platform_, name, inParentItemIdentifier, std::move(completionHandler));
}

void LocalFileProvider::renameItemWithIdentifier(std::string_view itemIdentifier,
                                                 std::string_view toName,
                                                 ItemCompletionHandler completionHandler) noexcept {
    renameItem(platform_, itemIdentifier, toName, std::move(completionHandler));
}

void LocalFileProvider::reparentItemWithIdentifier(
    std::string_view itemIdentifier, std::string_view toParentItemWithIdentifier,
    std::optional<std::string> newName, ItemCompletionHandler completionHandler) noexcept {
    reparentItem(platform_, itemIdentifier, toParentItemWithIdentifier, std::move(newName),
                 std::move(completionHandler));
}

void LocalFileProvider::trashItemWithIdentifier(std::string_view itemIdentifier,
                                                ItemCompletionHandler completionHandler) noexcept {
    trashItem(platform_, itemIdentifier, std::move(completionHandler));
}

void LocalFileProvider::untrashItemWithIdentifier(
    std::string_view itemIdentifier, std::optional<std::string> toParentItemIdentifier,
    ItemCompletionHandler completionHandler) noexcept {
    untrashItem(platform_, itemIdentifier, toParentItemIdentifier, std::move(completionHandler));
}

void LocalFileProvider::deleteItemWithIdentifier(
    std::string_view itemIdentifier, ErrorCompletionHandler completionHandler) noexcept {
    deleteItem(platform_, itemIdentifier, std::move(completionHandler));
}

void LocalFileProvider::setLastUsedDate(std::optional<Date> date,
                                        std::string_view forItemIdentifier,
                                        ItemCompletionHandler completionHandler) noexcept {
    marrowdale::setLastUsedDate(platform_, date, forItemIdentifier, completionHandler);
}

void LocalFileProvider::setTagData(std::optional<Data> tagData, std::string_view forItemIdentifier,
                                   ItemCompletionHandler completionHandler) noexcept {
    marrowdale::setTagData(platform_, tagData, forItemIdentifier, completionHandler);
}

void LocalFileProvider::setFavoriteRank(std::optional<Number> rank,
                                        std::string_view forItemIdentifier,
                                        ItemCompletionHandler completionHandler) noexcept {
    marrowdale::setFavoriteRank(platform_, rank, forItemIdentifier, completionHandler);
}

void LocalFileProvider::_removeTrashedItemsOlderThanDate(
    const Date& date, std::function<void()> completionHandler) noexcept {
    removeTrashedItemsOlderThan(platform_, date, std::move(completionHandler));
}

}  // namespace marrowdale
