#include "providers/marrowdale/fs/FSRetiredReaders.h"

#include <utility>

#include "providers/marrowdale/fs/FSEventReader.h"

namespace marrowdale {

FSRetiredReaders& FSRetiredReaders::of(const Platform& platform) {
    return platform.shared.get<FSRetiredReaders>("marrowdale.retired-readers");
}

void FSRetiredReaders::retire(std::shared_ptr<FSEventReader> reader) {
    retired_.enter();
    const SerialQueue queue = reader->streamQueue();
    queue.async([this, reader = std::move(reader)]() mutable {
        reader->stop();
        release(std::move(reader));
    });
}

void FSRetiredReaders::release(std::shared_ptr<FSEventReader> reader) {
    queue_.async([this, reader = std::move(reader)]() mutable {
        reader.reset();
        retired_.leave();
    });
}

void FSRetiredReaders::waitUntilGone() {
    retired_.wait();
}

}  // namespace marrowdale
