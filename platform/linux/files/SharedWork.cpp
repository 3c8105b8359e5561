#include "platform/linux/files/SharedWork.h"

#include <algorithm>
#include <atomic>
#include <memory>
#include <thread>

#include "platform/foundation/Semaphore.h"

namespace marrowdale::native {

namespace {

// Waking the helper costs as much as looking at a few entries.
constexpr std::size_t leastWorth = 32;
constexpr std::size_t stretch = 8;

// One run. The helper may come when it is over: then it must not touch `body`.
struct Run {
    enum class Helper : int { notYet, working, tooLate };

    std::size_t count = 0;
    const std::function<void(std::size_t, std::size_t)>* body = nullptr;
    std::atomic<std::size_t> next = 0;
    std::atomic<Helper> helper = Helper::notYet;
    Semaphore done;

    void work() {
        for (auto first = next.fetch_add(stretch); first < count; first = next.fetch_add(stretch)) {
            (*body)(first, std::min(first + stretch, count));
        }
    }
    bool claim(Helper state) {
        Helper expected = Helper::notYet;
        return helper.compare_exchange_strong(expected, state);
    }
};

}  // namespace

void SharedWork::run(std::size_t count, const std::function<void(std::size_t, std::size_t)>& body) {
    static const bool hasSecondProcessor = std::thread::hardware_concurrency() > 1;
    if (count < leastWorth || !hasSecondProcessor || !helper_.try_lock()) {
        body(0, count);
        return;
    }
    const std::lock_guard release(helper_, std::adopt_lock);
    const auto work = std::make_shared<Run>();
    work->count = count;
    work->body = &body;
    queue_.async([work] {
        if (work->claim(Run::Helper::working)) {
            work->work();
            work->done.signal();
        }
    });
    work->work();
    if (!work->claim(Run::Helper::tooLate)) {
        work->done.wait();
    }
}

}  // namespace marrowdale::native
