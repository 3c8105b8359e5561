#include "platform/linux/files/LinuxWriteAccess.h"

#include <cerrno>
#include <fcntl.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/LinuxOpenFile.h"
#include "platform/linux/files/Place.h"

namespace marrowdale::native {

namespace {

Error writeError(Error error, const URL& url) {
    if (error.domain == ErrorDomain::posix && (error.code == EACCES || error.code == EROFS)) {
        return errorFileWriteNoPermission();
    }
    error.subject = url.path();
    return error;
}

// Attributes need a descriptor of either kind, and the right to write.
Expected<UniqueFD> openEitherWay(const Place& place, const EntryStatus& status) {
    auto opened = place.open(O_RDONLY | O_NONBLOCK);
    if (!opened && opened.error().code == EACCES && status.isRegular()) {
        return place.open(O_WRONLY | O_NONBLOCK);
    }
    return opened;
}

Expected<UniqueFD> openItem(const URL& url, const ServedTrees& trees) {
    const auto place = Place::of(url, trees);
    const auto status = place ? place->look() : Unexpected(place.error());
    if (!status) {
        return Unexpected(status.error());
    }
    if (!status->isRegular() && !status->isDirectory()) {
        return Unexpected(errorWithPOSIXCode(ENOTSUP, "open for writing", url.path()));
    }
    if (::faccessat(place->directory(), place->name(), W_OK, AT_EACCESS | AT_SYMLINK_NOFOLLOW) !=
        0) {
        return Unexpected(errorWithPOSIXCode(errno, "open for writing", url.path()));
    }
    auto opened = openEitherWay(*place, *status);
    if (!opened) {
        return opened;
    }
    const auto found = statEntry(opened->get(), "");
    if (!found || found->fileID != status->fileID || found->device != status->device) {
        return Unexpected(errorWithPOSIXCode(ESTALE, "open for writing", url.path()));
    }
    return opened;
}

}  // namespace

Expected<std::unique_ptr<OpenFile>> LinuxWriteAccess::openForWriting(const URL& url) {
    auto opened = openItem(url, trees_);
    if (!opened) {
        return Unexpected(writeError(opened.error(), url));
    }
    return std::make_unique<LinuxOpenFile>(std::move(*opened), url);
}

}  // namespace marrowdale::native
