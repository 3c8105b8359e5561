#pragma once

#include <atomic>
#include <stop_token>
#include <thread>

namespace marrowdale::host {

// Turns SIGINT and SIGTERM into a request to stop. To be made before the process has other threads,
// for it blocks the two signals in the calling thread and those it starts. Before `begin`, while
// nothing can be stopped in order, a signal ends the process at once.
class StopSignals {
  public:
    StopSignals();
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    // From now on a signal asks for a stop.
    void begin() { hasBegun_ = true; }
    [[nodiscard]] std::stop_token token() const { return stop_.get_token(); }
    // Stops for another reason.
    void stop() { stop_.request_stop(); }
    // Returns when a stop was asked for.
    void wait() const;

  private:
    void run();

    std::stop_source stop_;
    std::atomic<bool> hasBegun_ = false;
    std::atomic<bool> isEnding_ = false;
    std::thread thread_;
};

}  // namespace marrowdale::host
