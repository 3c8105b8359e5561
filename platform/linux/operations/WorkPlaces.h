#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/linux/files/Place.h"
#include "platform/linux/files/ServedTrees.h"

namespace marrowdale::native {

// What an operation works on: an item by its place, with the status that it was found with.
struct WorkItem {
    URL url;
    Place place;
    EntryStatus status;

    [[nodiscard]] int folder() const { return place.directory(); }
    [[nodiscard]] const char* name() const { return place.name(); }
};
// EBUSY for the root of a served tree, which is no item of a folder.
[[nodiscard]] Expected<WorkItem> findItem(const URL& url, const ServedTrees& trees,
                                          std::string_view operation);

// A folder that an operation puts something into, open for reading.
struct WorkFolder {
    URL url;
    UniqueFD descriptor;

    [[nodiscard]] int get() const { return descriptor.get(); }
    [[nodiscard]] URL child(std::string_view name) const {
        return url.appendingPathComponent(name);
    }
};
// Fails where the URL does not name a real folder.
[[nodiscard]] Expected<WorkFolder> openFolderAt(const URL& url, const ServedTrees& trees);

// The folder that the item is in.
[[nodiscard]] Expected<WorkFolder> folderOf(const WorkItem& item);

}  // namespace marrowdale::native
