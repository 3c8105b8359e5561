// The document of one entry.

#include <cerrno>
#include <fcntl.h>
#include <utility>

#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

Expected<Store::Core::Request> Store::Core::requestFor(const std::string& path,
                                                       const EntryStatus& status) const {
    if (status.device != device_) {
        return Unexpected(errorWithPOSIXCode(ENXIO, "identify", path));
    }
    if (!roots_.storedPath(path) || roots_.folderAt(status) != nullptr) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "identify", path));
    }
    const std::string_view whole = path;
    const std::size_t slash = whole.rfind('/');
    const std::string folder(slash == 0 ? "/" : whole.substr(0, slash));
    const auto folderStatus = statEntry(AT_FDCWD, folder.c_str());
    if (!folderStatus) {
        return Unexpected(errorWithPOSIXCode(folderStatus.error().code, "look at", folder));
    }
    return Request{folderStatus->fileID,
                   slash == 0 ? "/" : whole.substr(0, slash),
                   whole.substr(slash + 1),
                   status,
                   {}};
}

Expected<DocumentID> Store::Core::documentOf(const OpenFile& file) {
    const std::string& path = file.url().path();
    const auto status = statEntry(file.descriptor(), "");
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, "look at", path));
    }
    if (const DocumentID known = knownDocumentID(*status); known != DocumentID{}) {
        return known;
    }
    auto request = requestFor(path, *status);
    if (!request) {
        return Unexpected(request.error());
    }
    if (auto assigned = assignDocumentIDs(std::span(&*request, 1)); !assigned) {
        return Unexpected(assigned.error());
    }
    return request->document;
}

Expected<DocumentID> Store::Core::documentAt(const std::string& path,
                                             AllocateIfNone allocateIfNone) {
    const auto status = statEntry(AT_FDCWD, path.c_str());
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, "look at", path));
    }
    auto request = requestFor(path, *status);
    if (!request) {
        return Unexpected(request.error());
    }
    if (allocateIfNone == AllocateIfNone::no) {
        return lookUpDocument(*request);
    }
    if (auto assigned = assignDocumentIDs(std::span(&*request, 1)); !assigned) {
        return Unexpected(assigned.error());
    }
    return request->document;
}

Expected<void> Store::Core::allocateAt(std::span<const std::string> paths) {
    std::vector<Request> requests;
    for (const std::string& path : paths) {
        const auto status = statEntry(AT_FDCWD, path.c_str());
        if (!status || status->isDirectory() || status->isMountPoint ||
            knownDocumentID(*status) != DocumentID{}) {
            continue;
        }
        if (auto request = requestFor(path, *status)) {
            requests.push_back(*request);
        }
    }
    return requests.empty() ? Expected<void>() : assignDocumentIDs(requests);
}

// A look is merged only where the entry is not known as it stands: a document whose file is the one
// that stands there is noted already.
Expected<DocumentID> Store::Core::lookUpDocument(Request& request) {
    std::vector<std::size_t> unknown;
    const std::span<Request> requests(&request, 1);
    request.document = knownDocumentID(request.status);
    if (request.document != DocumentID{}) {
        return request.document;
    }
    if (const auto folderKnown = fillKnown(requests, unknown); !folderKnown) {
        return Unexpected(folderKnown.error());
    }
    if (auto allowed = refuseForeign(requests, unknown); !allowed) {
        return Unexpected(allowed.error());
    }
    if (!unknown.empty()) {
        const Turn turn(*this);
        const auto looked = lookAtEntries(requests, unknown);
        if (!looked) {
            return Unexpected(looked.error());
        }
        const MutexLock lock(mutex_);
        const RowNumber row = rowOfLook(request, looked->front());
        request.document = DocumentID{row == noRow ? 0 : index_.row(row).document};
    }
    return request.document == DocumentID{} ? Expected<DocumentID>(Unexpected(errorWithPOSIXCode(
                                                  ENOENT, "find the document of", request.name)))
                                            : request.document;
}

}  // namespace marrowdale::native
