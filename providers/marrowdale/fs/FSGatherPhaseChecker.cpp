#include "providers/marrowdale/fs/FSGatherPhaseChecker.h"

namespace marrowdale {

using Status = FSEventReaderGatherPhaseResumeStatus;

void FSGatherPhaseChecker::fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& /*item*/,
                                                      const FileEvent& /*event*/) {}

void FSGatherPhaseChecker::fsEventReaderDidDeleteItem(const std::string& /*identifier*/,
                                                      const std::string& path,
                                                      const FileEvent& /*event*/) {
    // The first: of a document that was moved out of sight both places are told.
    if (gatherPhaseResumeStatus.kind == Status::Kind::canResume) {
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
