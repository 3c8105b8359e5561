#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/store/Mutex.h"

namespace marrowdale::native {

// The folders whose trees one store records: the root, and the libraries beside it, each under a
// key. Rows, events and reports name a place by its *stored path*: below the root, without a "/" in
// front; in a library "/KEY", or "/KEY/" and what follows. No file has a name with a "/" in it, so
// the two never meet. All ways from a stored path to the disk, and back, lead through here.
//
// Any thread. Libraries come and go by one call; what was asked for before keeps its folder open.
class RecordedRoots {
  public:
    struct Folder {
        std::string key;  // empty: the root
        std::string path;
        UniqueFD open;  // none: it can't be recorded now, and `problem` says why
        DeviceID device{};
        FileID file{};
        FileID parent{};  // of a library: the folder it is in, of which its removal is told
        std::optional<Error> problem;

        [[nodiscard]] std::string storedPath() const { return key.empty() ? key : "/" + key; }
        [[nodiscard]] bool isOpen() const { return static_cast<bool>(open); }
        [[nodiscard]] bool isAt(const EntryStatus& status) const {
            return isOpen() && status.fileID == file && status.device == device;
        }
        // Whether nothing of it is missed: one that is not there has nothing to record.
        [[nodiscard]] bool isRecorded() const;
    };
    using FolderPointer = std::shared_ptr<const Folder>;

    // The root is open, and stays the same.
    RecordedRoots(std::string rootPath, UniqueFD root);
    // Once, before anything else: what the root is.
    void noteRoot(const EntryStatus& status);
    [[nodiscard]] const Folder& root() const { return *root_; }

    void setLibraries(std::vector<FolderPointer> libraries) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::vector<FolderPointer> libraries() const MARROWDALE_EXCLUDES(mutex_);
    // Null when there is none of that key.
    [[nodiscard]] FolderPointer library(std::string_view key) const MARROWDALE_EXCLUDES(mutex_);

    // A place below an open folder.
    struct Place {
        FolderPointer in;
        std::string path;  // below `in`; empty for itself
        [[nodiscard]] int folder() const { return in->open.get(); }
    };
    // No value for what lies in a library that can't be recorded now, or is none any more.
    [[nodiscard]] std::optional<Place> place(std::string_view storedPath) const
        MARROWDALE_EXCLUDES(mutex_);
    // The way there by names. No value as above, but one that can't be recorded has its path still.
    [[nodiscard]] std::optional<std::string> absolutePath(std::string_view storedPath) const
        MARROWDALE_EXCLUDES(mutex_);
    // No value for what lies in none of the trees that are open.
    [[nodiscard]] std::optional<std::string> storedPath(std::string_view absolutePath) const
        MARROWDALE_EXCLUDES(mutex_);
    // Whether a library is, or was, in that folder.
    [[nodiscard]] bool isParent(FileID folder) const MARROWDALE_EXCLUDES(mutex_);
    // The open root or library that this is; null for anything else.
    [[nodiscard]] FolderPointer folderAt(const EntryStatus& status) const
        MARROWDALE_EXCLUDES(mutex_);

  private:
    // The folder that a stored path leads to, and what is left of the path; null for none.
    [[nodiscard]] FolderPointer folderOf(std::string_view& storedPath) const
        MARROWDALE_REQUIRES(mutex_);

    std::shared_ptr<Folder> root_;
    mutable Mutex mutex_;
    std::vector<FolderPointer> libraries_ MARROWDALE_GUARDED_BY(mutex_);
};

// Whether `path` is `folder` or lies below it, by names; both absolute, without a "/" at the end
// (but "/" itself).
[[nodiscard]] bool isAtOrBelow(std::string_view path, std::string_view folder);

}  // namespace marrowdale::native
