#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Log.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/streams/StreamFilter.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// What one stream tells, in batches: history up to a barrier, the history-done event, and then
// whatever was committed since, as often as it is asked. It keeps a place in the history and no
// events, so a slow reader costs nothing. Knows no queue and no time. One thread at a time.
class StreamReader {
  public:
    // Most events of a batch. (Two more may say that events were dropped and history is done.)
    static constexpr std::size_t batchSize = 256;

    StreamReader(std::vector<std::string> paths, std::optional<DeviceID> device, EventID since,
                 Log* log);

    struct Step {
        std::vector<FileEvent> batch;  // may be empty though there is more
        bool more = false;             // to be read right now
        bool toldBroken = false;
    };
    // The next batch. Looks at no more than a few thousand events, whomever they concern. `broken`
    // asks for an event that says so, once everything before was read. The first call takes a
    // barrier.
    [[nodiscard]] Step next(EventHistory& history, bool broken);
    // The last batch, when there is no history any more: the history-done event, if it was not
    // told.
    [[nodiscard]] Step close();
    // Gives up the place in the history. After this only `close` is called.
    void releaseCursor() { cursor_.reset(); }

  private:
    enum class Phase : std::uint8_t { starting, history, live, closed };

    void start(EventHistory& history, Step& step);
    [[nodiscard]] std::uint32_t problemOf(EventHistory::Standing standing) const;
    // False when everything that is committed was read.
    [[nodiscard]] bool read(EventHistory& history, Step& step);
    void readFailed(EventHistory& history, const Error& error, Step& step);
    // Goes on behind the newest event, having told that those before are dropped.
    void startOver(EventHistory& history, std::uint32_t flags, Step& step);
    void openCursor(EventHistory& history, EventID since);
    void endHistory(Step& step);
    void tell(std::uint32_t flags, Step& step) const;
    void log(const Error& error) const;

    const std::vector<std::string> paths_;
    const std::optional<DeviceID> device_;
    const EventID since_;
    Log* const log_;
    Phase phase_ = Phase::starting;
    std::optional<StreamFilter> filter_;
    std::unique_ptr<EventCursor> cursor_;  // null: it could not be opened
    EventID newest_{};                     // that was met, or is known to be there
    EventID historyEnd_{};
    std::optional<FileEvent> ahead_;  // the first live one, met while history was read
};

}  // namespace marrowdale::native
