#pragma once

#include <cstddef>
#include <memory>
#include <vector>

#include "platform/foundation/Mutex.h"

namespace marrowdale {

class FSChangesEnumerator;

// The requests for changes of one LocalFileEnumerator that are under way: the one owner of their
// enumerators. An object of its own, because a request ends on a queue on which nobody knows
// whether the LocalFileEnumerator is still there. Any thread.
class FSChangeRequests {
  public:
    FSChangeRequests() = default;
    FSChangeRequests(const FSChangeRequests&) = delete;
    FSChangeRequests& operator=(const FSChangeRequests&) = delete;
    ~FSChangeRequests() { close(); }

    // False, and nothing is kept, once they are closed.
    [[nodiscard]] bool insert(std::shared_ptr<FSChangesEnumerator> enumerator);
    // Nothing for one that is not there.
    void removeEnumerator(const FSChangesEnumerator& enumerator);
    // Stops all that are under way, and lets go of them.
    void stopAll();
    // The same, and for all that come later.
    void close();
    [[nodiscard]] bool isClosed() const;
    [[nodiscard]] std::size_t count() const;

  private:
    using Enumerators = std::vector<std::shared_ptr<FSChangesEnumerator>>;
    static void stop(const Enumerators& enumerators);

    mutable Mutex mutex_;
    Enumerators enumerators_ MARROWDALE_GUARDED_BY(mutex_);
    bool isClosed_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

}  // namespace marrowdale
