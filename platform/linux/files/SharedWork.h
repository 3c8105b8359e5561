#pragma once

#include <cstddef>
#include <functional>
#include <mutex>

#include "platform/foundation/SerialQueue.h"

namespace marrowdale::native {

// Shares work on many entries of one folder between the caller and one helper thread, which is
// started when first needed. A file system's answers come from its caches, so two threads get
// nearly twice as many of them.
//
// Any thread; who comes while the helper is busy does the work alone, and so does who has little.
class SharedWork {
  public:
    // Calls `body(first, last)` for stretches that together are [0, count), each once, from the
    // caller's thread and the helper's, and returns when all of them have returned. `body` must not
    // come back here.
    void run(std::size_t count, const std::function<void(std::size_t, std::size_t)>& body);

  private:
    std::mutex helper_;  // held by the caller that has the helper
    SerialQueue queue_{"marrowdale.shared-work"};
};

}  // namespace marrowdale::native
