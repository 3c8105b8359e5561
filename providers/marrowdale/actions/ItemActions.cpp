#include "providers/marrowdale/actions/ItemActions.h"

#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/actions/ActionCompletion.h"
#include "providers/marrowdale/items/ItemLookup.h"

namespace marrowdale {

namespace {

std::string text(std::string_view view) {
    return std::string(view);
}

FileOperations::URLHandler answering(const Platform& platform, ItemCompletionHandler handler) {
    return [&platform, handler = std::move(handler)](const Expected<URL>& answer) {
        handler(hostAnswer(platform, answer));
    };
}

// The folder that something is to be brought into; the root takes in nothing of its own accord.
Expected<URL> parentFolder(const Platform& platform, std::string_view identifier) {
    if (identifier == VantrelRootContainerItemIdentifier) {
        return Unexpected(errorFileWriteNoPermission());
    }
    return fetchURLOfItem(platform, identifier);
}

}  // namespace

void importDocument(const Platform& platform, const URL& url,
                    std::string_view toParentItemIdentifier, ItemCompletionHandler handler) {
    const LogSection section(platform.log, [&] {
        return "import document at \"" + url.absoluteString() + "\" to parent \"" +
               text(toParentItemIdentifier) + "\"";
    });
    const auto parent = parentFolder(platform, toParentItemIdentifier);
    if (!parent) {
        handler(Unexpected(parent.error()));
        return;
    }
    platform.fileOperations.importIntoFolder(url, *parent, answering(platform, std::move(handler)));
}

void createDirectory(const Platform& platform, std::string_view name,
                     std::string_view inParentItemIdentifier, ItemCompletionHandler handler) {
    const LogSection section(platform.log, [&] {
        return "create directory with name \"" + text(name) + "\" in parent \"" +
               text(inParentItemIdentifier) + "\"";
    });
    const auto parent = parentFolder(platform, inParentItemIdentifier);
    if (!parent) {
        handler(Unexpected(parent.error()));
        return;
    }
    platform.fileOperations.createSubfolder(*parent, name, answering(platform, std::move(handler)));
}

void renameItem(const Platform& platform, std::string_view itemIdentifier, std::string_view toName,
                ItemCompletionHandler handler) {
    const LogSection section(platform.log, [&] {
        return "rename item \"" + text(itemIdentifier) + "\" to name \"" + text(toName) + "\"";
    });
    const auto url = fetchURLOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(url.error()));
        return;
    }
    platform.fileOperations.renameInPlace(*url, toName, answering(platform, std::move(handler)));
}

void reparentItem(const Platform& platform, std::string_view itemIdentifier,
                  std::string_view toParentItemIdentifier, std::optional<std::string> newName,
                  ItemCompletionHandler handler) {
    const LogSection section(platform.log, [&] {
        return "move item \"" + text(itemIdentifier) + "\" to parent \"" +
               text(toParentItemIdentifier) + "\"";
    });
    if (toParentItemIdentifier == VantrelRootContainerItemIdentifier) {
        handler(Unexpected(errorFileWriteNoPermission()));
        return;
    }
    const auto parent = urlOfItem(platform, toParentItemIdentifier);
    if (!parent) {
        handler(Unexpected(errorForNonExistentItem(toParentItemIdentifier)));
        return;
    }
    const auto url = urlOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(errorForNonExistentItem(itemIdentifier)));
        return;
    }
    platform.fileOperations.moveIntoFolder(*url, *parent, std::move(newName),
                                           answering(platform, std::move(handler)));
}

}  // namespace marrowdale
