#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// The folders whose contents are served, and what of them is not. A path below one of them is gone
// down from the root that is held open, through real folders of the root's own file system alone:
// a folder on the way that was exchanged for a link, or that another tree is mounted on, leads
// nowhere. Applications own these trees, and may change them while they are looked at.
//
// Which folders are roots may change while they are used: what was located before stays good. Any
// thread.
class ServedTrees {
    struct Folder;

  public:
    // `rootFolders` and `privateFolders` are absolute paths. Private folders (the state's and the
    // cache's) are left out, with all that is in them, where they lie below a root; they are known
    // by their identity, so they must exist. One that is missing, or an empty path, is no folder.
    // A root that is missing now stays missing.
    ServedTrees(const std::vector<std::string>& rootFolders,
                const std::vector<std::string>& privateFolders);

    // From now on these are the roots. One that was a root before and stands where it stood is the
    // same; any other is looked up anew.
    void setRoots(const std::vector<std::string>& rootFolders);

    // A place below a root, or the root itself.
    struct Location {
        std::shared_ptr<const Folder> keptOpen;
        int root = -1;  // open for looking names up in it, as long as `keptOpen` is there
        DeviceID device{};
        bool mayMeetPrivateFolders = false;
        std::string relativePath;  // without "." and ".."; empty for the root
    };
    // The place of an absolute path without "." and "..", in the innermost root that contains it by
    // name; no value outside of all of them. ENOENT where the folder at the root's path is not the
    // one that was there at first (it was moved away, or made anew).
    [[nodiscard]] Expected<std::optional<Location>> locate(std::string_view path) const;
    // The same beside a place that was located just now: their root, where it is the same, is not
    // looked at again.
    [[nodiscard]] Expected<std::optional<Location>> locate(std::string_view path,
                                                           const Location& beside) const;

    // Opens the folder of that relative path as a place to look names up in. ENOENT for what is not
    // served, ENOTDIR for what is no folder.
    [[nodiscard]] Expected<UniqueFD> holdFolder(const Location& location,
                                                const std::string& relativePath) const;

    // Whether this is one of the private folders. No system call.
    [[nodiscard]] bool isPrivate(const EntryStatus& status) const;
    // Whether what was found below a root on that device is served: neither on another device, nor
    // a mount, nor a private folder. No system call.
    [[nodiscard]] bool includes(DeviceID device, const EntryStatus& found) const;
    // Whether the absolute path without "." and ".." lies below a root and is none itself, by name
    // alone: all such paths in one folder lie below the same root. No system call.
    [[nodiscard]] bool holds(std::string_view path) const;

  private:
    struct Folder {
        std::string path;
        UniqueFD held;  // none where it was missing; keeps its number from being given away
        DeviceID device{};
        FileID fileID{};
        bool holdsPrivateFolders = false;

        [[nodiscard]] bool isAt(const EntryStatus& status) const;
    };

    [[nodiscard]] static Location locationIn(std::shared_ptr<const Folder> root,
                                             std::string_view path);
    [[nodiscard]] static Folder open(const std::string& path);
    [[nodiscard]] static bool liesBelow(const Folder& inner, const Folder& outer);
    [[nodiscard]] std::shared_ptr<const Folder> openRoot(const std::string& path) const;
    [[nodiscard]] std::shared_ptr<const Folder> rootOf(std::string_view path) const;
    [[nodiscard]] Expected<UniqueFD> holdInSteps(int root, const std::string& relativePath) const;

    mutable std::mutex mutex_;
    std::vector<std::shared_ptr<const Folder>> roots_;  // guarded by mutex_
    std::vector<Folder> private_;
};

}  // namespace marrowdale::native
