#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/Frame.h"

namespace marrowdale::native {

// Reads the frames of one segment, checking each. One thread.
class SegmentReader {
  public:
    enum class Step : std::uint8_t {
        frame,
        end,  // exactly behind the last frame
        bad,  // what stands at `offset` is no frame, or cut off
    };

    // Checks the header: damage where it does not hold or is another store's or number's; a later
    // format. ENOENT stays.
    [[nodiscard]] static Expected<SegmentReader> open(const std::string& path, const UUID& store,
                                                      std::uint64_t number);

    [[nodiscard]] const SegmentHeader& segment() const { return segment_; }
    // Errors: the system's alone.
    [[nodiscard]] Expected<Step> next();
    // The frame of the last step; good until the next.
    [[nodiscard]] const FrameHeader& header() const { return header_; }
    [[nodiscard]] std::span<const std::byte> records() const { return records_; }
    // Behind the last good frame.
    [[nodiscard]] std::uint64_t offset() const { return offset_; }

  private:
    // At least `count` bytes from `offset_` on, or fewer at the end of the file.
    [[nodiscard]] Expected<std::span<const std::byte>> peek(std::size_t count);

    DiskFile file_;
    SegmentHeader segment_;
    FrameHeader header_;
    std::span<const std::byte> records_;
    std::vector<std::byte> buffer_;
    std::uint64_t bufferStart_ = 0;
    std::uint64_t offset_ = segmentHeaderSize;
};

}  // namespace marrowdale::native
