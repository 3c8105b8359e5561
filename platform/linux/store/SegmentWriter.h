#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/Frame.h"

namespace marrowdale::native {

// "log-0000000000000001"
[[nodiscard]] std::string segmentName(std::uint64_t number);

// Appends frames to one segment. One thread.
class SegmentWriter {
  public:
    SegmentWriter() = default;
    // Makes the segment, synced with its folder. An older file of that name is replaced.
    [[nodiscard]] static Expected<SegmentWriter> create(const std::string& folder,
                                                        const UUID& store,
                                                        const SegmentHeader& header);
    // Goes on in a segment that was read up to `offset`; what lies behind is cut off.
    [[nodiscard]] static Expected<SegmentWriter> resume(const std::string& folder,
                                                        std::uint64_t number, std::uint64_t offset);

    [[nodiscard]] std::uint64_t number() const { return number_; }
    // Where the next frame goes.
    [[nodiscard]] std::uint64_t offset() const { return offset_; }
    [[nodiscard]] Expected<void> append(const FrameHeader& header,
                                        std::span<const std::byte> records);
    [[nodiscard]] Expected<void> sync() const { return file_.sync(); }
    // Takes back what was appended behind `offset`.
    [[nodiscard]] Expected<void> cut(std::uint64_t offset);

  private:
    DiskFile file_;
    std::uint64_t number_ = 0;
    std::uint64_t offset_ = 0;
};

}  // namespace marrowdale::native
