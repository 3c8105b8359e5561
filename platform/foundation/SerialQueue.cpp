#include "platform/foundation/SerialQueue.h"

#include <atomic>
#include <deque>
#include <mutex>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale {

namespace {

// A caller of `sync` that waits for its turn; lives on that caller's stack.
struct Waiter {
    Condition turn;
};

// One place in the line: a block for the queue's thread, or a caller that runs its own.
struct Entry {
    std::move_only_function<void()> block;
    Waiter* waiter = nullptr;
};

// What the line's users and the queue's thread share; outlives both.
class Line {
  public:
    [[nodiscard]] bool isCurrent() const {
        return runner_.load(std::memory_order_relaxed) == std::this_thread::get_id();
    }

    void append(std::move_only_function<void()> block) {
        const MutexLock lock(mutex_);
        entries_.push_back({std::move(block), nullptr});
        if (!running_ && entries_.size() == 1) {
            threadTurn_.notifyOne();
        }
    }

    void run(const std::function<void()>& block) {
        takeTurn();
        const TurnEnd end{*this};
        block();
    }

    // The body of the queue's thread: runs blocks until the line is closed and empty.
    void serve() {
        while (auto block = nextBlock()) {
            const TurnEnd end{*this};
            block();
            // What the block captured goes while the block still counts as running.
            block = nullptr;
        }
    }

    void close() {
        const MutexLock lock(mutex_);
        closed_ = true;
        threadTurn_.notifyOne();
    }

  private:
    struct TurnEnd {
        Line& line;
        ~TurnEnd() { line.endTurn(); }
    };

    void takeTurn() {
        MutexLock lock(mutex_);
        if (running_ || !entries_.empty()) {
            Waiter self;
            entries_.push_back({nullptr, &self});
            while (running_ || entries_.front().waiter != &self) {
                self.turn.wait(lock);
            }
            entries_.pop_front();
        }
        beginTurn();
    }

    // Empty when the line is closed and nothing waits.
    std::move_only_function<void()> nextBlock() {
        MutexLock lock(mutex_);
        while (!isThreadsTurn()) {
            threadTurn_.wait(lock);
        }
        if (entries_.empty()) {
            return nullptr;
        }
        auto block = std::move(entries_.front().block);
        entries_.pop_front();
        beginTurn();
        return block;
    }

    [[nodiscard]] bool isThreadsTurn() const MARROWDALE_REQUIRES(mutex_) {
        return !running_ && (entries_.empty() ? closed_ : entries_.front().waiter == nullptr);
    }

    void beginTurn() MARROWDALE_REQUIRES(mutex_) {
        running_ = true;
        runner_.store(std::this_thread::get_id(), std::memory_order_relaxed);
    }

    void endTurn() {
        const MutexLock lock(mutex_);
        running_ = false;
        runner_.store(std::thread::id(), std::memory_order_relaxed);
        if (!entries_.empty() && entries_.front().waiter != nullptr) {
            entries_.front().waiter->turn.notifyOne();
        } else {
            threadTurn_.notifyOne();
        }
    }

    Mutex mutex_;
    Condition threadTurn_;
    std::deque<Entry> entries_ MARROWDALE_GUARDED_BY(mutex_);
    bool running_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool closed_ MARROWDALE_GUARDED_BY(mutex_) = false;
    // The thread whose block is running. A thread only ever compares it with itself, and it wrote
    // that value itself, so no order is needed.
    std::atomic<std::thread::id> runner_;
};

}  // namespace

// What the copies of a queue share. Its end is the end of the last copy.
class SerialQueue::State {
  public:
    explicit State(std::string_view label) : label_(label), line_(std::make_shared<Line>()) {}
    State(const State&) = delete;
    State& operator=(const State&) = delete;
    ~State() {
        line_->close();
        if (!thread_.joinable()) {
            return;
        }
        if (thread_.get_id() == std::this_thread::get_id()) {
            thread_.detach();  // can't wait for itself; keeps the line until it is empty
        } else {
            thread_.join();
        }
    }

    [[nodiscard]] const std::string& label() const { return label_; }
    [[nodiscard]] Line& line() const { return *line_; }

    void startThread() {
        std::call_once(threadStarted_, [this] {
            try {
                thread_ = std::thread([line = line_] { line->serve(); });
            } catch (const std::system_error& error) {
                fatalError("no thread for the queue \"" + label_ + "\": " + error.what());
            }
        });
    }

  private:
    std::string label_;
    std::shared_ptr<Line> line_;
    std::once_flag threadStarted_;
    std::thread thread_;
};

SerialQueue::SerialQueue(std::string_view label) : state_(std::make_shared<State>(label)) {}

const std::string& SerialQueue::label() const {
    return state_->label();
}

void SerialQueue::async(std::move_only_function<void()> block) const {
    if (!block) {
        fatalError("an empty block for the queue \"" + label() + "\"");
    }
    state_->startThread();
    state_->line().append(std::move(block));
}

void SerialQueue::sync(const std::function<void()>& block) const {
    if (isCurrent()) {
        fatalError("sync on the queue \"" + label() + "\" from one of its own blocks");
    }
    // The block may release the last copy; it then goes here, after the block's turn.
    const std::shared_ptr<State> state = state_;
    state->line().run(block);
}

bool SerialQueue::isCurrent() const {
    return state_->line().isCurrent();
}

}  // namespace marrowdale
