#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include <fmt/format.h>

#include "benchmarks/History.h"
#include "benchmarks/Suite.h"

namespace marrowdale::benchmarks {
namespace {

// Streams and bare cursors over one store.
class Replays {
  public:
    Replays(std::string folder, std::uint64_t events) : root_(std::move(folder)) {
        makeHistory(root_, root_ + ".state", events);
        store_ = openLiveStore(root_, root_ + ".state");
        last_ = recorded(*store_);  // NOLINT(*-prefer-member-initializer): needs the store
        events_ = std::make_unique<native::LinuxFileEvents>(*store_);
    }
    ~Replays() {
        events_.reset();
        store_.reset();
    }
    Replays(const Replays&) = delete;
    Replays& operator=(const Replays&) = delete;

    [[nodiscard]] Duration stream(std::uint64_t count) {
        return timed([&] {
            CountingStream stream(*events_, root_, before(count));
            stream.waitForHistory();
            check(stream.events(), count);
        });
    }
    [[nodiscard]] Duration cursor(std::uint64_t count) {
        return timed([&] {
            const auto cursor = store_->eventsSince(before(count));
            std::uint64_t seen = 0;
            while (const auto event = valueOf((*cursor)->next())) {
                seen += event->path.empty() ? 0U : 1U;
            }
            check(seen, count);
        });
    }
    // Until the first events of the last `count` arrive.
    [[nodiscard]] Duration start(std::uint64_t count) {
        std::unique_ptr<CountingStream> stream;
        return timed([&] {
            stream = std::make_unique<CountingStream>(*events_, root_, before(count));
            stream->waitForFirst();
        });
    }

  private:
    [[nodiscard]] EventID before(std::uint64_t count) const { return EventID{raw(last_) - count}; }
    static std::optional<native::StoredEvent> valueOf(
        Expected<std::optional<native::StoredEvent>> event) {
        if (!event) {
            throw std::runtime_error(event.error().description());
        }
        return *event;
    }
    static void check(std::uint64_t seen, std::uint64_t expected) {
        if (seen != expected) {
            throw std::runtime_error(fmt::format("replayed {} of {} events", seen, expected));
        }
    }

    const std::string root_;
    std::unique_ptr<native::Store> store_;
    std::unique_ptr<native::LinuxFileEvents> events_;
    EventID last_{};
};

void compareReplay(Suite& suite, Replays& history, std::uint64_t count) {
    Contest contest;
    contest.add("ours", [&] { return history.stream(count); });
    contest.add("floor", [&] { return history.cursor(count); });
    contest.run(suite.sizes.rounds);
    suite.table.add({.what = fmt::format("replay of {} events by a stream to a reader that only "
                                         "counts, against a bare cursor",
                                         count),
                     .measured = inWords(contest.median("ours").count()),
                     .against = inWords(contest.median("floor").count()),
                     .ratio = contest.ratio("ours", "floor"),
                     .target = 2.0});
}

void compareStarts(Suite& suite, Replays& large, Replays& small) {
    constexpr std::uint64_t tail = 100;
    Contest contest;
    contest.add("large", [&] { return large.start(tail); });
    contest.add("small", [&] { return small.start(tail); });
    contest.run(suite.sizes.rounds * 10);
    suite.table.add(
        {.what = fmt::format("start of a stream {} events before the end of {}, against {}: until "
                             "the first arrive",
                             tail, suite.sizes.manyEvents, suite.sizes.fewEvents),
         .measured = inWords(contest.median("large").count()),
         .against = inWords(contest.median("small").count()),
         .ratio = contest.ratio("large", "small"),
         .target = 1.5});
}

}  // namespace

void compareReplays(Suite& suite) {
    Replays large(suite.folder + "/history-long", suite.sizes.manyEvents);
    Replays small(suite.folder + "/history-short", suite.sizes.fewEvents);
    suite.table.heading("Replaying what happened");
    compareReplay(suite, large, suite.sizes.fewEvents);
    compareReplay(suite, large, suite.sizes.replayed);
    compareStarts(suite, large, small);
}

}  // namespace marrowdale::benchmarks
