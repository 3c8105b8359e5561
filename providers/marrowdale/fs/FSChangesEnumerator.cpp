#include "providers/marrowdale/fs/FSChangesEnumerator.h"

#include <algorithm>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/fs/FSChangesFilter.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"

namespace marrowdale {

namespace {

bool says(const FileEvent& event, std::uint32_t flags) {
    return (event.flags & flags) != 0;
}

bool isMoveToHere(const FileEvent& event) {
    return says(event, FileEventFlag::renamed) && !says(event, FileEventFlag::gone);
}

// The event of an update may tell of a document's deletion too, right after it.
bool mayTellOfDocumentToo(const LocalItem& item, const FileEvent& event) {
    const bool isDocumentGone =
        says(event, FileEventFlag::gone) && event.goneDocument != DocumentID{};
    return isDocumentGone || (item.isFolder() && isMoveToHere(event));
}

}  // namespace

std::shared_ptr<FSChangesEnumerator> FSChangesEnumerator::make(
    const Platform& platform, const FSChangeToken& token, std::string container,
    std::vector<URL> urls, std::shared_ptr<FileProviderChangeObserver> observer) {
    if (urls.empty()) {
        fatalError("require at least one URL to init a change enumerator");
    }
    auto enumerator = std::make_shared<FSChangesEnumerator>(
        Private{}, platform, token, std::move(container), std::move(urls), std::move(observer));
    const MutexLock lock(enumerator->mutex_);
    enumerator->reader_ = enumerator->makeReader(FSEventReaderMode::pathBased);
    return enumerator;
}

FSChangesEnumerator::FSChangesEnumerator(Private /*unused*/, const Platform& platform,
                                         const FSChangeToken& token, std::string container,
                                         std::vector<URL> urls,
                                         std::shared_ptr<FileProviderChangeObserver> observer)
    : platform_(platform),
      currentToken_(token),
      container_(std::move(container)),
      observer_(std::move(observer)),
      sinceFSEventID_{token.streamEventID},
      maxFSEventID_{token.streamEventID},
      urls_(std::move(urls)) {}

FSChangesEnumerator::~FSChangesEnumerator() {
    stop();
}

FSChangesEnumerator::Reader FSChangesEnumerator::makeReader(FSEventReaderMode mode) {
    return FSEventReader::make(platform_, {.urls = urls_,
                                           .mode = mode,
                                           .lastProcessedFSEventID = sinceFSEventID_,
                                           .verbose = mode == FSEventReaderMode::docIDBased,
                                           .delegate = weak_from_this()});
}

void FSChangesEnumerator::start() {
    const MutexLock lock(mutex_);
    if (reader_) {
        reader_->start();
    }
}

void FSChangesEnumerator::stop() {
    (void)end();
}

FSChangesEnumerator::Observer FSChangesEnumerator::listeningObserver() const {
    const MutexLock lock(mutex_);
    return reader_ && reader_->streamQueue().isCurrent() ? observer_ : nullptr;
}

EventID FSChangesEnumerator::lastProcessedEvent() const {
    const MutexLock lock(mutex_);
    return reader_ ? reader_->lastProcessedFSEventID() : sinceFSEventID_;
}

void FSChangesEnumerator::fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                                     const FileEvent& event) {
    if (!listeningObserver()) {
        return;
    }
    if (const auto reason = reasonToIgnoreUpdate(container_, *item); !reason.empty()) {
        platform_.log.debug([&] { return "ignore update of " + item->description() + reason; });
        return;
    }
    flushDeletions();
    if (isScanned(*item, event)) {
        tellFolder(item, event);
    } else if (forwardUpdate(item, event) == Batch::full) {
        finishEarly(event, mayTellOfDocumentToo(*item, event) ? Told::inPart : Told::whole);
    }
}

void FSChangesEnumerator::fsEventReaderDidDeleteItem(const std::string& identifier,
                                                     const std::string& /*path*/,
                                                     const FileEvent& event) {
    if (!listeningObserver()) {
        return;
    }
    switch (routeOfDeletion(container_, identifier)) {
        case DeletionRoute::ignoredAsLibrary:
            logIgnored(identifier, "; app library are not indexed");
            return;
        case DeletionRoute::ignoredAsNoDirectory:
            logIgnored(identifier, "; item is not a directory");
            return;
        case DeletionRoute::leftToTheRoot:
            leaveToTheRoot();
            return;
        case DeletionRoute::forwarded:
            break;
    }
    queueDeletion(identifier);
    if (count(1) == Batch::full) {
        const bool isLast =
            event.goneDocument == DocumentID{} ||
            identifier == MRWFileObjectIdentifier::fromDocumentID(raw(event.goneDocument));
        finishEarly(event, isLast ? Told::whole : Told::inPart);
    }
}

void FSChangesEnumerator::fsEventReaderDidFinishHistory(EventID eventID) {
    if (!listeningObserver()) {
        return;
    }
    maxFSEventID_ = std::max(maxFSEventID_, eventID);
    if (shouldProcessedFSEventsDocIDBased_) {
        platform_.log.debug(
            [] { return "processed all FSEvents path based, carry on with the docID based"; });
        beginDocumentPass();
        return;
    }
    platform_.log.debug([] { return "fetching changes did catch up"; });
    currentToken_.streamEventID = raw(maxFSEventID_);
    currentToken_.offset = 0;
    finish(MoreComing::no);
}

void FSChangesEnumerator::fsEventReaderMustReset() {
    if (listeningObserver()) {
        platform_.log.debug([] { return "fetching changes did finish after reset"; });
        finish(errorSyncAnchorExpired());
    }
}

bool FSChangesEnumerator::isScanned(const LocalItem& item, const FileEvent& event) const {
    return shouldProcessedFSEventsDocIDBased_ && isMoveToHere(event) && item.isFolder() &&
           (container_ == VantrelWorkingSetContainerItemIdentifier ||
            container_ == VantrelAllDirectoriesContainerItemIdentifier);
}

FSChangesEnumerator::Batch FSChangesEnumerator::forwardUpdate(
    const std::shared_ptr<LocalItem>& item, const FileEvent& event) {
    const auto observer = listeningObserver();
    if (!observer) {
        return Batch::open;
    }
    platform_.log.debug([&] {
        const std::string text = "forward update of " + item->description();
        return isMoveToHere(event) ? text + " to " + item->fileURL.path() : text;
    });
    observer->didUpdateItems({item});
    return count(1);
}

void FSChangesEnumerator::queueDeletion(const std::string& identifier) {
    platform_.log.debug([&] { return "forward deletion of " + identifier; });
    queuedDeletions_.push_back(identifier);
    if (flushIsOnItsWay_) {
        return;
    }
    flushIsOnItsWay_ = true;
    const MutexLock lock(mutex_);
    if (reader_) {
        reader_->streamQueue().async([weak = weak_from_this()] {
            if (const auto enumerator = weak.lock()) {
                enumerator->flushBehindBatch();
            }
        });
    }
}

void FSChangesEnumerator::flushBehindBatch() {
    if (listeningObserver()) {
        flushIsOnItsWay_ = false;
        flushDeletions();
    }
}

void FSChangesEnumerator::flushDeletions() {
    const auto observer = listeningObserver();
    if (!observer || queuedDeletions_.empty()) {
        return;
    }
    platform_.log.debug([&] {
        return "forward deletion of " + std::to_string(queuedDeletions_.size()) + " items";
    });
    observer->didDeleteItemsWithIdentifiers(std::exchange(queuedDeletions_, {}));
}

void FSChangesEnumerator::logIgnored(const std::string& identifier, std::string_view reason) const {
    platform_.log.debug([&] { return "ignore update of " + identifier + std::string(reason); });
}

// Which libraries there are is known above; the host is made to ask there, and not from within this
// request.
void FSChangesEnumerator::leaveToTheRoot() const {
    const MutexLock lock(mutex_);
    if (reader_) {
        reader_->streamQueue().async([&manager = platform_.manager] {
            manager.signalEnumeratorForContainerItemIdentifier(VantrelRootContainerItemIdentifier,
                                                               {});
        });
    }
}

void FSChangesEnumerator::beginDocumentPass() {
    flushDeletions();
    shouldProcessedFSEventsDocIDBased_ = false;
    flushIsOnItsWay_ = false;
    const Reader next = makeReader(FSEventReaderMode::docIDBased);
    Reader last;
    {
        const MutexLock lock(mutex_);
        if (!reader_) {
            return;
        }
        last = std::exchange(reader_, next);
    }
    // Before the next one may end everything: nobody would wait for the last.
    FSRetiredReaders::of(platform_).retire(std::move(last));
    const MutexLock lock(mutex_);
    if (reader_) {
        reader_->start();
    }
}

FSChangesEnumerator::Batch FSChangesEnumerator::count(std::uint64_t changes) {
    numberOfChanges_ += changes;
    return numberOfChanges_ == batchSize ? Batch::full : Batch::open;
}

void FSChangesEnumerator::finishEarly(const FileEvent& event, Told told, std::uint64_t offset) {
    EventID upTo = told == Told::whole ? event.id : lastProcessedEvent();
    if (!shouldProcessedFSEventsDocIDBased_) {
        upTo = std::min(upTo, maxFSEventID_);
    }
    currentToken_.streamEventID = raw(upTo);
    currentToken_.offset = offset;
    finish(MoreComing::yes);
}

void FSChangesEnumerator::finish(MoreComing moreComing) {
    flushDeletions();
    if (const auto observer = end()) {
        observer->finishEnumeratingChangesUpToSyncAnchor(currentToken_.encode(), moreComing);
    }
}

void FSChangesEnumerator::finish(const Error& error) {
    flushDeletions();
    if (const auto observer = end()) {
        observer->finishEnumeratingWithError(error);
    }
}

FSChangesEnumerator::Observer FSChangesEnumerator::end() {
    Reader reader;
    Observer observer;
    {
        const MutexLock lock(mutex_);
        reader = std::move(reader_);
        observer = std::move(observer_);
    }
    if (reader) {
        if (!reader->streamQueue().isCurrent()) {
            reader->stop();
        }
        FSRetiredReaders::of(platform_).retire(std::move(reader));
    }
    return observer;
}

}  // namespace marrowdale
