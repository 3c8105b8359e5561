#pragma once

#include <memory>

#include "platform/Platform.h"
#include "platform/foundation/Semaphore.h"
#include "platform/foundation/SerialQueue.h"

namespace marrowdale {

class FSEventReader;

// Where readers go whose work is done. A reader is stopped by a block of its own queue, so that no
// stream is torn down from inside its own callback, and then let go of on this object's queue,
// where the thread of the reader's queue can be waited for: a thread that released its own queue
// would be waited for by nobody, and might outlive the module that its code lies in.
//
// One for a world. Any thread, the readers' own queues among them.
class FSRetiredReaders {
  public:
    FSRetiredReaders() = default;
    FSRetiredReaders(const FSRetiredReaders&) = delete;
    FSRetiredReaders& operator=(const FSRetiredReaders&) = delete;
    ~FSRetiredReaders() { waitUntilGone(); }

    [[nodiscard]] static FSRetiredReaders& of(const Platform& platform);

    // Returns at once. Whatever the reader still tells meanwhile, its delegate has to ignore.
    void retire(std::shared_ptr<FSEventReader> reader);
    // Until every reader that was retired is gone, and its thread with it. Not to be called on the
    // queue of a reader.
    void waitUntilGone();

  private:
    void release(std::shared_ptr<FSEventReader> reader);

    WorkGroup retired_;  // and not gone
    const SerialQueue queue_{"marrowdale.retired-readers"};
};

}  // namespace marrowdale
