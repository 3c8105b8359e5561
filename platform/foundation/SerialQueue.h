#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>

namespace marrowdale {

// Runs blocks one after another, in the order in which they came, never two at once.
//
// `async` hands a block to the queue's own thread, which is started with the first one; `sync` runs
// the block on the caller's thread when its turn has come, and returns its result. A `sync` from a
// block of the same queue would wait for itself: it ends the process with a message.
//
// Ownership: copies name the same queue. The last copy to go lets the blocks that are waiting run
// to their end, then ends the thread and joins it, but for the queue's own thread, which may
// release the queue from within its own block and then ends by itself.
class SerialQueue {
  public:
    explicit SerialQueue(std::string_view label);

    [[nodiscard]] const std::string& label() const;
    void async(std::move_only_function<void()> block) const;
    void sync(const std::function<void()>& block) const;
    // True on a thread that is running a block of this queue.
    [[nodiscard]] bool isCurrent() const;

  private:
    class State;
    std::shared_ptr<State> state_;
};

}  // namespace marrowdale
