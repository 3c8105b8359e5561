#include "providers/marrowdale/actions/TrashAttributes.h"

#include <cerrno>
#include <string>

#include "platform/foundation/KeyedArchive.h"
#include "providers/marrowdale/actions/ReadWriteAccess.h"
#include "providers/marrowdale/items/AppLibraryOfURL.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemMetadata.h"
#include "providers/marrowdale/items/PutBack.h"

namespace marrowdale {

namespace {

int setArchived(const Platform& platform, const URL& url, std::string_view name,
                const ArchivedObject& object) {
    const auto value = archive(object);
    if (!value) {
        return value.error().code;
    }
    return withReadWriteAccess(platform, url, [&](const OpenFile& file) {
        return setXattr(platform, file, name, *value);
    });
}

}  // namespace

void writeTrashDate(const Platform& platform, const URL& url, const std::optional<Date>& date) {
    platform.log.debug([&] { return "setting trash date on " + url.absoluteString(); });
    const int code = date ? setArchived(platform, url, trashDateAttribute, *date)
                          : withReadWriteAccess(platform, url, [&](const OpenFile& file) {
                                return removeXattr(platform, file, trashDateAttribute);
                            });
    if (code != 0) {
        platform.log.error("can't " + std::string(date ? "set" : "remove") + " xattr " +
                           std::string(trashDateAttribute) + " on " + url.absoluteString() + "; " +
                           errorWithPOSIXCode(code).description());
    }
}

void writePutBack(const Platform& platform, const URL& source, const URL& url) {
    platform.log.debug([&] { return "setting putback string on " + url.absoluteString(); });
    const auto library = appLibraryItemHolding(platform, source);
    if (!library) {
        platform.log.error("couldn't find app library for " + source.absoluteString());
        return;
    }
    const URL& base = library->fileURL;
    const auto string = putBackString(source, base);
    if (!string) {
        // One bracket is never closed; readers of the log look for the line as it is.
        platform.log.error("could't compute putback string (path: " + source.absoluteString() +
                           ", basePath: " + base.absoluteString());
        return;
    }
    platform.log.debug(
        [&] { return "setting putback '" + *string + "' on " + url.absoluteString(); });
    if (const int code = setArchived(platform, url, trashPutBackAttribute, *string); code != 0) {
        platform.log.error("couldn't set putback xattr (" + *string + ") on " +
                           url.absoluteString() + "; " + errorWithPOSIXCode(code).description());
    }
}

}  // namespace marrowdale
