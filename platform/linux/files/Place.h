#pragma once

#include <fcntl.h>
#include <memory>
#include <optional>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/linux/files/Access.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// The error of a look at an item as callers tell one that is not there from one that can't be
// looked at: the file domain's 260 for the former. The subject is the URL's path.
[[nodiscard]] Error itemError(Error error, const URL& url);

// An item's path in the form that system calls take: an open folder and a name in it.
//
// In a served tree the folder is the one the item is in, reached without leaving the tree; what
// stands there and is not served (another device, something mounted, a private folder, anything
// behind a link) is not there: ENOENT. Errors carry the URL's path. Outside, links above the item
// are followed; for paths that one call can take the folder is AT_FDCWD and the name the whole
// path, longer ones have their folder opened.
class Place {
  public:
    // EINVAL for a URL that is no file URL. Must not outlive the trees.
    [[nodiscard]] static Expected<Place> of(const URL& url, const ServedTrees& trees);
    // The same for a file URL that was located.
    [[nodiscard]] static Expected<Place> at(const URL& url,
                                            const std::optional<ServedTrees::Location>& location,
                                            const ServedTrees& trees);

    [[nodiscard]] int directory() const { return directory_; }
    // "." for the root of a served tree.
    [[nodiscard]] const char* name() const { return name_.c_str(); }
    [[nodiscard]] bool isServed() const { return device_.has_value(); }
    // Whether `directory` is the folder that the item is in.
    [[nodiscard]] bool hasParent() const;
    // The device that the item must lie on to be served; none for a root and outside.
    [[nodiscard]] std::optional<DeviceID> device() const;
    // Whether the item's mount refuses writing.
    [[nodiscard]] Mount mount() const;

    // Looks at the item itself. Calls that take `directory` and `name` only come after it.
    [[nodiscard]] Expected<EntryStatus> look() const;
    // Opens the item itself with these flags and O_NOFOLLOW | O_CLOEXEC | O_NOCTTY.
    [[nodiscard]] Expected<UniqueFD> open(int flags) const;
    // Opens the item as a folder for reading; the folder's status with it.
    struct OpenedFolder {
        UniqueFD descriptor;
        EntryStatus status;
    };
    [[nodiscard]] Expected<OpenedFolder> openFolder() const;

  private:
    Place(URL url, const ServedTrees& trees, std::string name);

    [[nodiscard]] static Expected<Place> outside(const URL& url, const ServedTrees& trees);
    [[nodiscard]] static Expected<Place> inside(const URL& url,
                                                const ServedTrees::Location& location,
                                                const ServedTrees& trees);
    [[nodiscard]] Expected<EntryStatus> checked(const Expected<EntryStatus>& status) const;
    [[nodiscard]] bool isRoot() const { return isServed() && name_ == "."; }

    URL url_;
    const ServedTrees& trees_;
    std::optional<DeviceID> device_;    // of the served tree
    std::shared_ptr<const void> root_;  // keeps it open
    UniqueFD folder_;                   // unless the folder is a root, or none
    int directory_ = AT_FDCWD;
    std::string name_;
};

}  // namespace marrowdale::native
