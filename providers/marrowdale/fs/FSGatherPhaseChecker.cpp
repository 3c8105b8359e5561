#include "providers/marrowdale/fs/FSGatherPhaseChecker.h"

namespace marrowdale {

using Status = FSEventReaderGatherPhaseResumeStatus;

void FSGatherPhaseChecker::fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& /*item*/,
                                                      const FileEvent& /*event*/) {}

void FSGatherPhaseChecker::fsEventReaderDidDeleteItem(const std::string& /*identifier*/,
                                                      const std::string& path,
                                                      const FileEvent& /*event*/) {
    if (gatherPhaseResumeStatus.kind != Status::Kind::cantReplayHistoricalFSEvents) {
        gatherPhaseResumeStatus = Status::deletionOccurred(path);
    }
}

void FSGatherPhaseChecker::fsEventReaderDidFinishHistory(EventID /*eventID*/) {
    sema.signal();
}

void FSGatherPhaseChecker::fsEventReaderMustReset() {
    gatherPhaseResumeStatus = Status::cantReplayHistoricalFSEvents();
    sema.signal();
}

}  // namespace marrowdale
