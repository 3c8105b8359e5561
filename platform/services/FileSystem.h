#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"
#include "platform/services/DirectoryEnumerator.h"

namespace marrowdale {

// A file that is held open; closed when released. Made by FileSystem and WriteAccess alone.
class OpenFile {
  public:
    virtual ~OpenFile() = default;
    // The system's descriptor, for the platform's own services.
    [[nodiscard]] virtual int descriptor() const = 0;
    // Where it was opened.
    [[nodiscard]] virtual const URL& url() const = 0;
};

enum class FileType : std::uint8_t { regular, directory, symbolicLink, other };

// Answer of one attribute query on an open file.
struct CommonAttributes {
    DeviceID device{};
    FileType type = FileType::other;
    DocumentID documentID{};  // 0 when the document has none yet
    FileID fileID{};
    std::uint32_t linkCount = 0;  // the number of names, as the file system keeps it
};

// What a look at items is to bring along on each URL; see DirectoryEnumerationRequest.
struct LookRequest {
    ResourceKeySet keys;
    std::vector<std::string> attributeNames;
    bool prefetchStatus = true;
};

// What the provider asks of the file system. All calls are synchronous and may come from any
// thread, several at once. Paths are bytes. Errors are POSIX errors with operation and path, but
// where told.
class FileSystem {
  public:
    virtual ~FileSystem() = default;

    // Opens the item itself, for looking at only (neither reading nor writing), without waiting and
    // without following a final link.
    [[nodiscard]] virtual Expected<std::unique_ptr<OpenFile>> openForEvents(const URL& url) = 0;

    [[nodiscard]] virtual Expected<CommonAttributes> commonAttributes(const OpenFile& file) = 0;

    // The status of the item at a path, links followed; a link that leads nowhere is ENOENT, a loop
    // of links ELOOP. Answered from what a listing learnt, when the URL comes from one.
    [[nodiscard]] virtual Expected<FileStatus> status(const URL& url) = 0;

    // Reads one resource of the item itself (a link is not followed), from the values cached on the
    // URL if they are there, and caches on the URL what the look at the file brought. monostate
    // when the item has no such value (a folder's file size). Asking for documentIdentifier gives
    // the item one if it has none, durable when the call returns. An item that is not there is the
    // file domain's error 260.
    [[nodiscard]] virtual Expected<ResourceValue> resourceValue(const URL& url,
                                                                ResourceKey key) = 0;

    // Looks at items as a listing looks at what it finds, those of one folder together: each answer
    // is the URL anew, with the values asked for brought along as a listing's URLs bring them, and
    // its folder's number and kind with the folder's URL. Nothing that was cached on the URL given
    // is used. Document identifiers that are given out are durable when the call returns (one sync
    // for all). What could not be brought along for an item that is there (a document identifier
    // on a full disk; anything for a path with "." or "..") is read when somebody asks for it, who
    // gets the error. An error for an item that can't be looked at, the file domain's 260 for one
    // that is not there. One answer a URL, in their order.
    [[nodiscard]] virtual std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                                            const LookRequest& request) = 0;

    // The path of a file by its number: the place where it stands now. ENOENT when the volume's
    // served trees hold no such file, ENXIO for another volume.
    [[nodiscard]] virtual Expected<std::string> pathForFileID(DeviceID device, FileID file) = 0;

    // Opens a folder for listing. The folder itself must be a real folder, not a link to one.
    [[nodiscard]] virtual Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) = 0;

    // Makes the folder and those above it that are missing, without special attributes; a folder
    // that exists is success.
    [[nodiscard]] virtual Expected<void> createDirectory(const URL& url) = 0;
};

}  // namespace marrowdale
