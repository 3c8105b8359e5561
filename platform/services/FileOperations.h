#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// What stands where an operation wanted to put something; carried by the file domain's 516.
struct CollidingURLInfo final : ErrorUserInfo {
    explicit CollidingURLInfo(URL urlInTheWay) : collidingURL(std::move(urlInTheWay)) {}
    URL collidingURL;
};

// The file domain's 516 for a name that is taken. `operation` as in Error.
[[nodiscard]] inline Error errorFileExists(std::string_view operation, const URL& inTheWay) {
    return {ErrorDomain::file, static_cast<int>(FileErrorCode::fileExists), std::string(operation),
            inTheWay.path(), std::make_shared<CollidingURLInfo>(inTheWay)};
}
// The URL in the way; none for an error that carries none.
[[nodiscard]] inline std::optional<URL> collidingURLOf(const Error& error) {
    const auto* info = dynamic_cast<const CollidingURLInfo*>(error.userInfo.get());
    const bool isCollision = error.domain == ErrorDomain::file &&
                             error.code == static_cast<int>(FileErrorCode::fileExists);
    return isCollision && info != nullptr ? std::optional(info->collidingURL) : std::nullopt;
}

// Moves, copies and removes files.
//
// Every operation returns once it is under way and answers once, on a thread of its own. Nothing is
// overwritten and nothing lost: an operation that fails, is cancelled or is killed with the process
// leaves what was there before. Links are moved, copied and removed themselves, never followed. The
// place that an operation works in is reached without following a link.
//
// Errors: a name that is taken is the file domain's 516 with the URL in the way (errorFileExists);
// everything else is POSIX, with operation and path: EINVAL for what is no name of a file and for a
// folder that would come to lie in itself, ENAMETOOLONG, ECANCELED, EBUSY for a source that changed
// while it was copied, and what the system refuses with.
class FileOperations {
  public:
    virtual ~FileOperations() = default;

    // The URL that the thing has now, or why nothing was done.
    using URLHandler = std::function<void(Expected<URL>)>;
    // Why nothing was done; none for success.
    using ErrorHandler = std::function<void(const std::optional<Error>&)>;

    // Brings a copy of the document (a folder with its contents) into the folder, under its own
    // name, complete and on disk when it appears there.
    virtual void importIntoFolder(const URL& source, const URL& folder, URLHandler handler) = 0;
    virtual void createSubfolder(const URL& folder, std::string_view name, URLHandler handler) = 0;
    // A name that it has already is success.
    virtual void renameInPlace(const URL& item, std::string_view newName, URLHandler handler) = 0;
    // `newName`: none keeps the name.
    virtual void moveIntoFolder(const URL& item, const URL& folder,
                                std::optional<std::string> newName, URLHandler handler) = 0;
    // Takes a free name ("name 2.ext") where its own is taken. The trash must be a folder.
    virtual void trashIntoFolder(const URL& item, const URL& trashFolder, URLHandler handler) = 0;
    // The same for any folder.
    virtual void moveIntoFolderAvoidingCollision(const URL& item, const URL& folder,
                                                 URLHandler handler) = 0;
    // A folder with its contents: it goes from its place at once, and then from the disk. Where the
    // file system can't do that, or is full, it is taken apart in its place. A URL that knows its
    // file (ResourceKey::fileID is cached on it) means that file alone: ENOENT where another has
    // the name by now.
    virtual void deleteItemAtURL(const URL& item, ErrorHandler handler) = 0;
};

}  // namespace marrowdale
