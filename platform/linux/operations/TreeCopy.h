#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/operations/OperationRun.h"

namespace marrowdale::native {

// What a copy begins with: an entry of an open folder, and how errors name it.
struct CopySource {
    int folder = -1;  // AT_FDCWD with a whole path as name
    std::string name;
    EntryStatus status;  // of the entry itself
    std::string path;
};

// Copies the source, a folder with all that is in it, to `name` in the open folder, where nothing
// may stand (EEXIST). Links are copied as links; pipes and sockets are made anew; devices are
// refused (ENOTSUP), and so are mounts in a folder (EXDEV). EBUSY when something of it was changed
// meanwhile. What fails leaves what was made by then; the caller removes it.
//
// A folder's own attributes come last, when everything is in it, but for the permissions of the
// outermost one: those are answered, because a folder that may not be written can't be moved.
struct CopiedTree {
    std::uint32_t mode = 0;
    bool isFolder = false;
};
[[nodiscard]] Expected<CopiedTree> copyTree(const CopySource& source, int folder,
                                            const std::string& name, OperationRun& run);

// Opens the regular file or folder that the source is, and nothing that took its place: ESTALE.
[[nodiscard]] Expected<UniqueFD> openSource(const CopySource& source);

}  // namespace marrowdale::native
