#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/foundation/SerialQueue.h"

namespace marrowdale {

// Turns many requests into few events: the event block runs on the queue at most once an interval,
// counted from the beginning of one event to the beginning of the next, and at least once after
// every signal. Signals before `resume` are kept; a signal while the block runs leads to another
// event. An event begins a little after its signal (10 ms), so that requests which are made
// together have one. Nothing runs, and nothing is woken, without a signal.
//
// Any thread, also from the event block. The pacer may be released anywhere; an event that is
// running then goes on to its end, and none begins any more.
class RefreshPacer {
  public:
    // `name` is for people who look at threads.
    [[nodiscard]] static std::unique_ptr<RefreshPacer> makePacer(
        std::string_view name, const SerialQueue& queue,
        std::chrono::steady_clock::duration minimumFireInterval);
    ~RefreshPacer();
    RefreshPacer(const RefreshPacer&) = delete;
    RefreshPacer& operator=(const RefreshPacer&) = delete;

    // Before `resume`; once.
    void setEventBlock(std::function<void()> block);
    void resume();
    void signal();

    [[nodiscard]] const std::string& name() const { return name_; }

  private:
    class Schedule;
    RefreshPacer(std::string_view name, std::shared_ptr<Schedule> schedule);

    std::string name_;
    std::shared_ptr<Schedule> schedule_;
};

}  // namespace marrowdale
