#pragma once

#include <memory>
#include <string>

#include "platform/foundation/Semaphore.h"
#include "providers/marrowdale/fs/FSEventReaderDelegate.h"
#include "providers/marrowdale/fs/FSEventReaderGatherPhaseResumeStatus.h"

namespace marrowdale {

// Reads a history to its end, for the length of one check, and keeps what it found.
//
// `sema` is signalled when the history is done, and at a reset, behind which nothing could change
// the answer any more: a reset is kept, and of several deletions the first.
class FSGatherPhaseChecker : public FSEventReaderDelegate {
  public:
    // Touched on the reader's queue alone.
    FSEventReaderGatherPhaseResumeStatus gatherPhaseResumeStatus =
        FSEventReaderGatherPhaseResumeStatus::canResume();
    Semaphore sema{0};

    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                    const FileEvent& event) override;
    void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                    const FileEvent& event) override;
    void fsEventReaderDidFinishHistory(EventID eventID) override;
    void fsEventReaderMustReset() override;
};

}  // namespace marrowdale
