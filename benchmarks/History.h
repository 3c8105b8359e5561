#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <span>
#include <string>

#include "benchmarks/Measurement.h"
#include "benchmarks/Trees.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/linux/store/Store.h"
#include "platform/linux/streams/LinuxFileEvents.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::benchmarks {

// A store that records what happens below the root. Throws where it can't: no watcher, no store.
[[nodiscard]] std::unique_ptr<native::Store> openLiveStore(const std::string& root,
                                                           const std::string& state);

// The newest event, once everything done before is recorded. Throws what the store answers.
EventID recorded(native::Store& store);

// Gives the file that other modification time, now: one event.
void touch(const std::string& path);
// That many different files of the tree, at random places; `round` makes the choice differ.
[[nodiscard]] std::vector<std::string> randomFiles(const Tree& tree, std::uint64_t count,
                                                   std::uint64_t round);

// The middle of what passes between a change of a file and the moment in which `arrive` returns.
[[nodiscard]] Duration medianDelay(const Tree& tree, std::uint64_t changes,
                                   const std::function<void(const std::string& path)>& arrive);

// A stream with latency 0 over a store's whole tree, whose reader only counts.
class CountingStream {
  public:
    CountingStream(native::LinuxFileEvents& events, const std::string& root, EventID since);
    ~CountingStream();
    CountingStream(const CountingStream&) = delete;
    CountingStream& operator=(const CountingStream&) = delete;

    // Return when that has come; throw when it does not within a minute.
    void waitForFirst();
    void waitForHistory();
    // Until there were that many events besides the history-done event.
    void waitForEvents(std::uint64_t count);
    [[nodiscard]] std::uint64_t events() const;

  private:
    void take(std::span<const FileEvent> batch);
    template <typename Condition>
    void wait(const Condition& condition) const;

    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::uint64_t events_ = 0;
    bool isHistoryDone_ = false;
    std::unique_ptr<FileEventStream> stream_;
};

// An empty folder and its state folder, in whose store there are that many events with paths of 85
// bytes, written through the journal a thousand at a time. What an earlier run left is used.
void makeHistory(const std::string& root, const std::string& state, std::uint64_t events);

}  // namespace marrowdale::benchmarks
