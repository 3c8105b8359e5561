#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
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
    [[nodiscard]] Expected<std::uint64_t> fileSize() const { return file_.size(); }
    // Nothing at this offset or behind it is looked at.
    void limitTo(std::uint64_t offset) { limit_ = offset; }
    // Goes on at this offset, where a frame begins.
    void seek(std::uint64_t offset) { offset_ = offset; }
    // How much is read at once; 1 MiB at first.
    void setReadAhead(std::size_t bytes) { readAhead_ = bytes; }
    // Gives the memory of what was read back.
    void releaseBuffer();

    // Errors: the system's alone.
    [[nodiscard]] Expected<Step> next();
    // The same in two steps: the header, and then either the records or not.
    [[nodiscard]] Expected<Step> nextHeader();
    [[nodiscard]] Expected<Step> takeRecords();
    // Bad when they go beyond the limit. Whether the file is that long shows at the next step.
    [[nodiscard]] Step skipRecords();
    // The frame of the last step; good until the next.
    [[nodiscard]] const FrameHeader& header() const { return header_; }
    [[nodiscard]] std::span<const std::byte> records() const { return records_; }
    // Behind the last good frame.
    [[nodiscard]] std::uint64_t offset() const { return offset_; }

  private:
    // `count` bytes from `offset_` on, or fewer at the end of the file or the limit.
    [[nodiscard]] Expected<std::span<const std::byte>> peek(std::size_t count);

    DiskFile file_;
    SegmentHeader segment_;
    FrameHeader header_;
    std::span<const std::byte> records_;
    std::vector<std::byte> buffer_;
    std::uint64_t bufferStart_ = 0;
    std::uint64_t offset_ = segmentHeaderSize;
    std::uint64_t limit_ = std::numeric_limits<std::uint64_t>::max();
    std::size_t readAhead_ = 1U << 20U;
    std::uint32_t length_ = 0;  // of the records behind `header_`
    std::uint32_t recordsChecksum_ = 0;
};

}  // namespace marrowdale::native
