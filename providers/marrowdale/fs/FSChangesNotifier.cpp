#include "providers/marrowdale/fs/FSChangesNotifier.h"

#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"

namespace marrowdale {

std::shared_ptr<FSChangesNotifier> FSChangesNotifier::make(const Platform& platform,
                                                           std::string container,
                                                           const std::vector<URL>& urls) {
    if (urls.empty()) {
        fatalError("require at least one URL to init a change notifier");
    }
    const auto uuid = FSEventReader::volumeUUID(platform, urls.front());
    if (!uuid) {
        platform.log.error("can't get volume UUID for \"" + urls.front().path() + "\"");
        return nullptr;
    }
    const auto eventID = platform.fileEvents.currentEventID();
    if (!eventID) {
        platform.log.error("can't read the current event; " + eventID.error().description());
        return nullptr;
    }
    auto notifier =
        std::make_shared<FSChangesNotifier>(Private{}, platform, std::move(container), *uuid);
    notifier->reader_ = FSEventReader::make(platform, {.urls = urls,
                                                       .mode = FSEventReaderMode::pathBased,
                                                       .lastProcessedFSEventID = *eventID,
                                                       .verbose = true,
                                                       .delegate = notifier});
    return notifier;
}

FSChangesNotifier::FSChangesNotifier(Private /*unused*/, const Platform& platform,
                                     std::string container, UUID deviceUUID)
    : platform_(platform), container_(std::move(container)), deviceUUID_(deviceUUID) {}

// A reader that was never started has no thread that must be waited for.
FSChangesNotifier::~FSChangesNotifier() {
    const MutexLock lock(mutex_);
    if (wasStarted_) {
        reader_->stop();
        FSRetiredReaders::of(platform_).retire(std::move(reader_));
    }
}

void FSChangesNotifier::start() {
    const MutexLock lock(mutex_);
    wasStarted_ = true;
    setShouldSignalChange(Signalling::on);
    reader_->start();
}

void FSChangesNotifier::stop() {
    const MutexLock lock(mutex_);
    if (wasStarted_) {
        reader_->stop();
        setShouldSignalChange(Signalling::off);
    }
}

void FSChangesNotifier::setShouldSignalChange(Signalling signalling) {
    reader_->streamQueue().async([weak = weak_from_this(), signalling] {
        if (const auto notifier = weak.lock()) {
            notifier->shouldSignalChange_ = signalling == Signalling::on;
        }
    });
}

void FSChangesNotifier::fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& /*item*/,
                                                   const FileEvent& /*event*/) {
    signalChange();
}

void FSChangesNotifier::fsEventReaderDidDeleteItem(const std::string& /*identifier*/,
                                                   const std::string& /*path*/,
                                                   const FileEvent& /*event*/) {
    signalChange();
}

void FSChangesNotifier::fsEventReaderDidFinishHistory(EventID /*eventID*/) {}

void FSChangesNotifier::fsEventReaderMustReset() {
    signalChange();
}

void FSChangesNotifier::signalChange() const {
    if (!shouldSignalChange_) {
        return;
    }
    if (container_ != VantrelWorkingSetContainerItemIdentifier) {
        signal(VantrelRootContainerItemIdentifier);
    }
    signal(VantrelWorkingSetContainerItemIdentifier);
}

void FSChangesNotifier::signal(std::string_view identifier) const {
    platform_.log.info([&] { return "notify changes on " + std::string(identifier); });
    platform_.manager.signalEnumeratorForContainerItemIdentifier(identifier, {});
}

}  // namespace marrowdale
