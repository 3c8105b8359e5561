#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/daemon/SignalHub.h"
#include "platform/foundation/Log.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::host {

// Signals the working set whenever something happens in a trash: the feed of the working set leaves
// the trash out, and whoever shows it lists it again. Any thread.
class TrashWatch {
  public:
    // The trashes of these documents folders, whether or not they are there yet. The service, the
    // hub and the log outlive it.
    TrashWatch(FileEventService& events, SignalHub& signals, Log& log,
               const std::vector<std::string>& documentsFolders);
    // No signal comes from it afterwards.
    ~TrashWatch();
    TrashWatch(const TrashWatch&) = delete;
    TrashWatch& operator=(const TrashWatch&) = delete;

  private:
    SerialQueue queue_{"marrowdale.host.trash"};
    std::unique_ptr<FileEventStream> stream_;  // null: it could not be had, which was logged
};

}  // namespace marrowdale::host
