#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/LogView.h"
#include "platform/linux/store/Record.h"
#include "platform/linux/store/SegmentReader.h"

namespace marrowdale::native {

// Reads the events of the segments of a LogView. Holds little memory, and next to none at the end.
// After an error it answers that error for good.
class LogCursor final : public EventCursor {
  public:
    struct Start {
        LogView::Segment segment;
        std::uint64_t offset = 0;    // of a frame, or the segment's end
        std::uint64_t sequence = 0;  // of the frame before
        std::uint64_t since = 0;     // events up to this one are passed over
    };
    // Errors as `next` has them.
    [[nodiscard]] static Expected<std::unique_ptr<EventCursor>> open(
        std::shared_ptr<const LogView> view, const Start& start);

    [[nodiscard]] Expected<std::optional<StoredEvent>> next() override;

  private:
    LogCursor(std::shared_ptr<const LogView> view, SegmentReader reader, const Start& start);

    [[nodiscard]] Expected<std::optional<StoredEvent>> step();
    [[nodiscard]] Expected<std::optional<StoredEvent>> nextInFrame();
    // Takes the next frame that has events which were not passed; false at the end.
    [[nodiscard]] Expected<bool> nextFrame();
    // Takes or passes the frame at the reader's offset. True when it was taken.
    [[nodiscard]] Expected<bool> lookAtFrame();
    [[nodiscard]] Expected<void> enter(const LogView::Segment& segment);
    [[nodiscard]] static Expected<SegmentReader> openSegment(const LogView& view,
                                                             const LogSegment& segment);
    [[nodiscard]] Error damage(std::string_view what) const;

    const std::shared_ptr<const LogView> view_;
    LogView::Segment segment_;
    SegmentReader reader_;
    std::uint64_t sequence_;               // of the last frame that was met
    std::uint64_t passed_;                 // the last event that was handed out or passed over
    std::optional<RecordReader> records_;  // of the frame that is being read
    std::uint32_t recordsLeft_ = 0;
    std::uint64_t nextID_ = 0;
    std::string path_;  // of the last event in the frame
    std::optional<Error> failure_;
};

}  // namespace marrowdale::native
