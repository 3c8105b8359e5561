#include "platform/linux/store/SegmentReader.h"

#include <algorithm>
#include <array>
#include <fcntl.h>

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

Expected<SegmentHeader> checkHeader(std::span<const std::byte> bytes, const std::string& path,
                                    const UUID& store, std::uint64_t number) {
    if (bytes.size() < segmentHeaderSize) {
        return Unexpected(damageOf(path, "cut off"));
    }
    ByteReader in(bytes);
    const bool sameMagic = in.take<Magic>() == segmentMagic;
    const auto version = in.take<std::uint32_t>();
    (void)in.take<std::uint32_t>();
    const UUID found{in.take<decltype(UUID::bytes)>()};
    SegmentHeader header;
    header.number = in.take<std::uint64_t>();
    header.firstSequence = in.take<std::uint64_t>();
    header.lastEventBefore = in.take<std::uint64_t>();
    header.created = in.take<std::uint32_t>();
    if (!sameMagic || in.take<std::uint32_t>() != crc32c(bytes.first(segmentHeaderSize - 4))) {
        return Unexpected(damageOf(path, "its header's checksum does not hold"));
    }
    if (version > storeFormatVersion) {
        return Unexpected(laterFormatOf(path, version));
    }
    if (found != store || header.number != number) {
        return Unexpected(damageOf(path, "not of this store"));
    }
    return header;
}

}  // namespace

Expected<SegmentReader> SegmentReader::open(const std::string& path, const UUID& store,
                                            std::uint64_t number) {
    auto file = DiskFile::open(path, O_RDONLY);
    if (!file) {
        return Unexpected(file.error());
    }
    std::array<std::byte, segmentHeaderSize> bytes{};
    const auto count = file->read(bytes, 0);
    if (!count) {
        return Unexpected(count.error());
    }
    const auto header = checkHeader(std::span(bytes).first(*count), path, store, number);
    if (!header) {
        return Unexpected(header.error());
    }
    SegmentReader reader;
    reader.file_ = std::move(*file);
    reader.segment_ = *header;
    return reader;
}

Expected<std::span<const std::byte>> SegmentReader::peek(std::size_t count) {
    const std::uint64_t left = limit_ - std::min(offset_, limit_);
    count = static_cast<std::size_t>(std::min<std::uint64_t>(count, left));
    if (count == 0) {
        return std::span<const std::byte>();
    }
    const std::uint64_t bufferEnd = bufferStart_ + buffer_.size();
    if (offset_ + count > bufferEnd || offset_ < bufferStart_) {
        buffer_.resize(
            static_cast<std::size_t>(std::min<std::uint64_t>(std::max(count, readAhead_), left)));
        bufferStart_ = offset_;
        const auto filled = file_.read(buffer_, offset_);
        if (!filled) {
            return Unexpected(filled.error());
        }
        buffer_.resize(*filled);
    }
    const auto all = std::span<const std::byte>(buffer_).subspan(offset_ - bufferStart_);
    return all.first(std::min(count, all.size()));
}

void SegmentReader::releaseBuffer() {
    records_ = {};
    std::vector<std::byte>().swap(buffer_);
    bufferStart_ = offset_;
}

Expected<SegmentReader::Step> SegmentReader::nextHeader() {
    const auto head = peek(frameHeaderSize);
    if (!head) {
        return Unexpected(head.error());
    }
    if (head->empty()) {
        return Step::end;
    }
    if (head->size() < frameHeaderSize) {
        return Step::bad;
    }
    ByteReader in(*head);
    const bool sameMagic = in.take<FrameMagic>() == frameMagic;
    length_ = in.take<std::uint32_t>();
    header_.sequence = in.take<std::uint64_t>();
    header_.firstEvent = in.take<std::uint64_t>();
    header_.lastEvent = in.take<std::uint64_t>();
    header_.recordCount = in.take<std::uint32_t>();
    header_.flags = in.take<std::uint32_t>();
    recordsChecksum_ = in.take<std::uint32_t>();
    const bool holds = in.take<std::uint32_t>() == crc32c(head->first(frameHeaderSize - 4));
    return sameMagic && holds && length_ <= largestFrame ? Step::frame : Step::bad;
}

Expected<SegmentReader::Step> SegmentReader::takeRecords() {
    const auto whole = peek(frameHeaderSize + length_);
    if (!whole) {
        return Unexpected(whole.error());
    }
    if (whole->size() < frameHeaderSize + length_) {
        return Step::bad;
    }
    records_ = whole->subspan(frameHeaderSize);
    if (crc32c(records_) != recordsChecksum_) {
        return Step::bad;
    }
    offset_ += frameHeaderSize + length_;
    return Step::frame;
}

SegmentReader::Step SegmentReader::skipRecords() {
    const std::uint64_t end = offset_ + frameHeaderSize + length_;
    if (end > limit_) {
        return Step::bad;
    }
    offset_ = end;
    return Step::frame;
}

Expected<SegmentReader::Step> SegmentReader::next() {
    auto step = nextHeader();
    return step && *step == Step::frame ? takeRecords() : step;
}

}  // namespace marrowdale::native
