#include "providers/marrowdale/fs/FSChangesFilter.h"

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale {

std::string reasonToIgnoreUpdate(std::string_view container, const LocalItem& item) {
    if (container != VantrelWorkingSetContainerItemIdentifier &&
        container != VantrelAllDirectoriesContainerItemIdentifier) {
        // The root is its own parent, and not its own child.
        const bool isChild =
            item.parentItemIdentifier == container && item.itemIdentifier != container;
        return isChild ? "" : "; item is not a directory of " + std::string(container);
    }
    if (item.hx_isContainer() || item.itemIdentifier.starts_with('#')) {
        return "; app library are not indexed";
    }
    return container == VantrelAllDirectoriesContainerItemIdentifier && !item.isFolder()
               ? "; item is not a directory"
               : "";
}

DeletionRoute routeOfDeletion(std::string_view container, std::string_view identifier) {
    const bool isLibrary = identifier.starts_with('#');
    if (container == VantrelWorkingSetContainerItemIdentifier && isLibrary) {
        return DeletionRoute::ignoredAsLibrary;
    }
    if (container == VantrelAllDirectoriesContainerItemIdentifier &&
        !identifier.starts_with("fid=")) {
        return DeletionRoute::ignoredAsNoDirectory;
    }
    if (container == VantrelRootContainerItemIdentifier && isLibrary) {
        return DeletionRoute::leftToTheRoot;
    }
    return DeletionRoute::forwarded;
}

}  // namespace marrowdale
