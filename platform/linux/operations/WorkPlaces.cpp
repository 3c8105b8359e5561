#include "platform/linux/operations/WorkPlaces.h"

#include <cerrno>
#include <string_view>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"

namespace marrowdale::native {

Expected<WorkItem> findItem(const URL& url, const ServedTrees& trees, std::string_view operation) {
    auto place = Place::of(url, trees);
    const auto status = place ? place->look() : Unexpected(place.error());
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, operation, url.path()));
    }
    if (place->isServed() && !place->hasParent()) {
        return Unexpected(errorWithPOSIXCode(EBUSY, operation, url.path()));
    }
    return WorkItem{url, std::move(*place), *status};
}

Expected<WorkFolder> openFolderAt(const URL& url, const ServedTrees& trees) {
    const auto place = Place::of(url, trees);
    auto opened = place ? place->openFolder() : Unexpected(place.error());
    if (!opened) {
        return Unexpected(errorWithPOSIXCode(opened.error().code, "open the folder", url.path()));
    }
    return WorkFolder{url, std::move(opened->descriptor)};
}

Expected<WorkFolder> folderOf(const WorkItem& item) {
    const URL above = item.url.deletingLastPathComponent();
    auto folder =
        item.place.hasParent() ? openFolderBeneath(item.folder(), {}) : openFolder(above.path());
    if (!folder) {
        return Unexpected(errorWithPOSIXCode(folder.error().code, "open the folder", above.path()));
    }
    return WorkFolder{above, std::move(*folder)};
}

}  // namespace marrowdale::native
