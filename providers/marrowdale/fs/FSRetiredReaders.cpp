#include "providers/marrowdale/fs/FSRetiredReaders.h"

#include <utility>

#include "providers/marrowdale/fs/FSEventReader.h"

namespace marrowdale {

FSRetiredReaders& FSRetiredReaders::of(const Platform& platform) {
    return platform.shared.get<FSRetiredReaders>("marrowdale.retired-readers");
}

void FSRetiredReaders::retire(std::shared_ptr<FSEventReader> reader) {
    {
        const MutexLock lock(mutex_);
        ++count_;
    }
    const SerialQueue queue = reader->streamQueue();
    queue.async([this, reader = std::move(reader)]() mutable {
        reader->stop();
        release(std::move(reader));
    });
}

void FSRetiredReaders::release(std::shared_ptr<FSEventReader> reader) {
    queue_.async([this, reader = std::move(reader)]() mutable {
        reader.reset();
        const MutexLock lock(mutex_);
        --count_;
        gone_.notifyAll();
    });
}

void FSRetiredReaders::waitUntilGone() {
    MutexLock lock(mutex_);
    while (count_ > 0) {
        gone_.wait(lock);
    }
}

}  // namespace marrowdale
