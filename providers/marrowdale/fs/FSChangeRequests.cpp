#include "providers/marrowdale/fs/FSChangeRequests.h"

#include <algorithm>
#include <utility>

#include "providers/marrowdale/fs/FSChangesEnumerator.h"

namespace marrowdale {

// Enumerators are released without the lock: with them go the observers of the host.

bool FSChangeRequests::insert(std::shared_ptr<FSChangesEnumerator> enumerator) {
    const MutexLock lock(mutex_);
    if (isClosed_) {
        return false;
    }
    enumerators_.push_back(std::move(enumerator));
    return true;
}

void FSChangeRequests::removeEnumerator(const FSChangesEnumerator& enumerator) {
    std::shared_ptr<FSChangesEnumerator> removed;
    const MutexLock lock(mutex_);
    const auto found =
        std::ranges::find(enumerators_, &enumerator, &std::shared_ptr<FSChangesEnumerator>::get);
    if (found != enumerators_.end()) {
        removed = std::move(*found);
        enumerators_.erase(found);
    }
}

void FSChangeRequests::stopAll() {
    Enumerators stopped;
    {
        const MutexLock lock(mutex_);
        stopped.swap(enumerators_);
    }
    stop(stopped);
}

void FSChangeRequests::close() {
    Enumerators stopped;
    {
        const MutexLock lock(mutex_);
        isClosed_ = true;
        stopped.swap(enumerators_);
    }
    stop(stopped);
}

bool FSChangeRequests::isClosed() const {
    const MutexLock lock(mutex_);
    return isClosed_;
}

std::size_t FSChangeRequests::count() const {
    const MutexLock lock(mutex_);
    return enumerators_.size();
}

void FSChangeRequests::stop(const Enumerators& enumerators) {
    for (const auto& enumerator : enumerators) {
        enumerator->stop();
    }
}

}  // namespace marrowdale
