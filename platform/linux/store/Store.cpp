#include "platform/linux/store/Store.h"

#include <utility>

#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

Store::Store(std::unique_ptr<Core> core) : core_(std::move(core)) {}
Store::~Store() = default;

Expected<std::unique_ptr<Store>> Store::open(const StoreOptions& options) {
    auto core = Core::open(options);
    if (!core) {
        return Unexpected(core.error());
    }
    return std::unique_ptr<Store>(new Store(std::move(*core)));
}

Expected<void> Store::reconcile() {
    return core_->reconcile();
}

Expected<void> Store::setLibraries(std::vector<LibraryFolder> libraries) {
    return core_->setLibraries(std::move(libraries));
}

StoreReport Store::report() const {
    return core_->report();
}

OwnMoves& Store::ownMoves() {
    return core_->ownMoves();
}

Expected<FileID> Store::resolveDocumentID(DocumentID document, DeviceID device) {
    return core_->resolveDocumentID(document, device);
}

Expected<DocumentID> Store::getOrAllocateDocumentID(const OpenFile& file) {
    return core_->documentOf(file);
}

Expected<DocumentID> Store::permanentStorageForItemAtURL(const URL& url,
                                                         AllocateIfNone allocateIfNone) {
    return core_->documentAt(url.path(), allocateIfNone);
}

Expected<void> Store::allocatePermanentStorage(std::span<const std::string> paths) {
    return core_->allocateAt(paths);
}

Expected<EventID> Store::barrier() {
    return core_->barrier();
}

EventID Store::lastEventOfEarlierRuns() const {
    return core_->lastEventOfEarlierRuns();
}

EventID Store::lastEventID() {
    return core_->lastEventID();
}

EventHistory::Standing Store::standingOf(EventID since) {
    return core_->standingOf(since);
}

Expected<std::unique_ptr<EventCursor>> Store::eventsSince(EventID since) {
    return core_->eventsSince(since);
}

std::vector<EventRoot> Store::roots() {
    return core_->eventRoots();
}

DeviceID Store::device() {
    return core_->device();
}

Expected<UUID> Store::volumeUUID(const URL& url) {
    return core_->volumeUUID(url);
}

std::uint64_t Store::addListener(std::function<void(News)> listener) {
    return core_->addListener(std::move(listener));
}

void Store::removeListener(std::uint64_t number) {
    core_->removeListener(number);
}

Expected<void> Store::assignDocumentIDs(std::span<Request> requests) {
    return core_->assignDocumentIDs(requests);
}

Expected<void> Store::confirmFolders(std::span<Request> requests) {
    return core_->confirmFolders(requests);
}

DocumentID Store::knownDocumentID(const EntryStatus& status) {
    return core_->knownDocumentID(status);
}

Expected<std::string> Store::pathForFileID(DeviceID device, FileID file) {
    return core_->pathForFileID(device, file);
}

std::uint32_t Store::subfolderCount(FileID folder) {
    return core_->subfolderCount(folder);
}

}  // namespace marrowdale::native
