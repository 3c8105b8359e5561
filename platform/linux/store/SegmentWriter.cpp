#include "platform/linux/store/SegmentWriter.h"

#include <array>
#include <cstdio>
#include <fcntl.h>

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/Bytes.h"

namespace marrowdale::native {

std::string segmentName(std::uint64_t number) {
    std::string digits = std::to_string(number);
    constexpr std::size_t width = 16;
    if (digits.size() < width) {
        digits.insert(0, width - digits.size(), '0');
    }
    return "log-" + digits;
}

Expected<SegmentWriter> SegmentWriter::create(const std::string& folder, const UUID& store,
                                              const SegmentHeader& header) {
    auto file =
        DiskFile::open(folder + "/" + segmentName(header.number), O_RDWR | O_CREAT | O_TRUNC);
    if (!file) {
        return Unexpected(file.error());
    }
    ByteWriter out;
    out.put(segmentMagic);
    out.put(storeFormatVersion);
    out.put(std::uint32_t{0});
    out.put(store.bytes);
    out.put(header.number);
    out.put(header.firstSequence);
    out.put(header.lastEventBefore);
    out.put(header.created);
    out.put(crc32c(out.bytes()));
    if (auto written = file->write(out.bytes(), 0); !written) {
        return Unexpected(written.error());
    }
    if (auto synced = file->sync(); !synced) {
        return Unexpected(synced.error());
    }
    if (auto synced = syncFolder(folder); !synced) {
        return Unexpected(synced.error());
    }
    SegmentWriter writer;
    writer.file_ = std::move(*file);
    writer.number_ = header.number;
    writer.offset_ = segmentHeaderSize;
    return writer;
}

Expected<SegmentWriter> SegmentWriter::resume(const std::string& folder, std::uint64_t number,
                                              std::uint64_t offset) {
    auto file = DiskFile::open(folder + "/" + segmentName(number), O_RDWR);
    if (!file) {
        return Unexpected(file.error());
    }
    const auto size = file->size();
    if (!size) {
        return Unexpected(size.error());
    }
    SegmentWriter writer;
    writer.file_ = std::move(*file);
    writer.number_ = number;
    writer.offset_ = offset;
    if (*size != offset) {
        if (auto done = writer.cut(offset); !done) {
            return Unexpected(done.error());
        }
        if (auto synced = writer.sync(); !synced) {
            return Unexpected(synced.error());
        }
    }
    return writer;
}

Expected<void> SegmentWriter::append(const FrameHeader& header,
                                     std::span<const std::byte> records) {
    ByteWriter out;
    out.put(frameMagic);
    out.put(static_cast<std::uint32_t>(records.size()));
    out.put(header.sequence);
    out.put(header.firstEvent);
    out.put(header.lastEvent);
    out.put(header.recordCount);
    out.put(header.flags);
    out.put(crc32c(records));
    out.put(crc32c(out.bytes()));
    out.append(records);
    if (auto written = file_.write(out.bytes(), offset_); !written) {
        return written;
    }
    offset_ += out.size();
    return {};
}

Expected<void> SegmentWriter::cut(std::uint64_t offset) {
    if (auto done = file_.truncate(offset); !done) {
        return done;
    }
    offset_ = offset;
    return {};
}

}  // namespace marrowdale::native
