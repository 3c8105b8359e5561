#include "platform/linux/store/Snapshot.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <fcntl.h>

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/Envelope.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

constexpr Magic magic{'M', 'W', 's', 'n', 'a', 'p', 's', 'h'};
constexpr std::size_t headerSize = 80;
constexpr std::uint32_t blockSize = NameArena::blockSize;
constexpr RowNumber rowsPerBlock = blockSize / sizeof(Row);

std::uint64_t sectionSize(std::uint64_t bytes) {
    return bytes + (bytes + blockSize - 1) / blockSize * sizeof(std::uint32_t);
}

// Blocks behind each other, each with its checksum behind it.
class BlockWriter {
  public:
    explicit BlockWriter(DiskFile file) : file_(std::move(file)) {}
    [[nodiscard]] Expected<void> write(std::span<const std::byte> bytes) {
        auto written = file_.write(bytes, offset_);
        offset_ += bytes.size();
        return written;
    }
    [[nodiscard]] Expected<void> writeBlock(std::span<const std::byte> block) {
        if (auto written = write(block); !written) {
            return written;
        }
        const std::uint32_t checksum = crc32c(block);
        return write(std::as_bytes(std::span(&checksum, 1)));
    }
    [[nodiscard]] Expected<std::uint64_t> finish() {
        if (auto synced = file_.sync(); !synced) {
            return Unexpected(synced.error());
        }
        return offset_;
    }

  private:
    DiskFile file_;
    std::uint64_t offset_ = 0;
};

class BlockReader {
  public:
    BlockReader(const DiskFile& file, std::uint64_t offset) : file_(file), offset_(offset) {}
    [[nodiscard]] Expected<void> readBlock(std::span<std::byte> block) {
        std::uint32_t checksum = 0;
        const auto count = file_.read(block, offset_);
        if (!count) {
            return Unexpected(count.error());
        }
        const auto rest =
            file_.read(std::as_writable_bytes(std::span(&checksum, 1)), offset_ + block.size());
        if (!rest) {
            return Unexpected(rest.error());
        }
        offset_ += block.size() + sizeof checksum;
        if (*count != block.size() || *rest != sizeof checksum || crc32c(block) != checksum) {
            return Unexpected(damageOf(file_.path(), "a block's checksum does not hold"));
        }
        return {};
    }

  private:
    const DiskFile& file_;
    std::uint64_t offset_;
};

struct Sizes {
    std::uint32_t rows = 0;
    std::uint32_t names = 0;
    std::uint32_t gaps = 0;

    [[nodiscard]] std::uint64_t fileSize() const {
        return headerSize + sectionSize(std::uint64_t{rows} * sizeof(Row)) + sectionSize(names) +
               sectionSize(std::uint64_t{gaps} * sizeof(EventGap));
    }
};

std::vector<std::byte> encodeHeader(const UUID& store, const SnapshotHeader& header,
                                    const Sizes& sizes) {
    ByteWriter out;
    out.put(magic);
    out.put(storeFormatVersion);
    out.put(static_cast<std::uint32_t>(sizeof(Row)));
    out.put(store.bytes);
    out.put(header.segment);
    out.put(header.sequence);
    out.put(header.lastEvent);
    out.put(header.lastDocument);
    out.put(sizes.rows);
    out.put(sizes.names);
    out.put(sizes.gaps);
    out.put(blockSize);
    out.put(crc32c(out.bytes()));
    return {out.bytes().begin(), out.bytes().end()};
}

Expected<void> writeRows(BlockWriter& out, const Index& index) {
    for (RowNumber start = 0; start < index.endOfRows(); start += rowsPerBlock) {
        const RowNumber count = std::min(rowsPerBlock, index.endOfRows() - start);
        const auto rows = std::span(&index.row(start), count);
        if (auto written = out.writeBlock(std::as_bytes(rows)); !written) {
            return written;
        }
    }
    return {};
}

Expected<void> writeNames(BlockWriter& out, const NameArena& names) {
    for (std::size_t block = 0; block < names.blockCount(); ++block) {
        if (auto written = out.writeBlock(std::as_bytes(names.block(block))); !written) {
            return written;
        }
    }
    return {};
}

Expected<void> writeGaps(BlockWriter& out, const std::vector<EventGap>& gaps) {
    return gaps.empty() ? Expected<void>() : out.writeBlock(std::as_bytes(std::span(gaps)));
}

Expected<void> readRows(BlockReader& in, Index& index, RowNumber count) {
    for (RowNumber start = 0; start < count; start += rowsPerBlock) {
        const RowNumber part = std::min(rowsPerBlock, count - start);
        Row* rows = index.addRawRows(part);
        if (auto read = in.readBlock(std::as_writable_bytes(std::span(rows, part))); !read) {
            return read;
        }
    }
    return {};
}

Expected<void> readNames(BlockReader& in, NameArena& names, std::uint32_t bytes) {
    for (std::uint32_t left = bytes; left > 0;) {
        const std::uint32_t part = std::min(blockSize, left);
        const auto block = names.addBlock(part);
        if (auto read = in.readBlock(std::as_writable_bytes(block)); !read) {
            return read;
        }
        left -= part;
    }
    return {};
}

struct CheckedHeader {
    SnapshotHeader header;
    Sizes sizes;
};

Expected<CheckedHeader> readHeader(const DiskFile& file, const UUID& store) {
    std::array<std::byte, headerSize> bytes{};
    const auto count = file.read(bytes, 0);
    if (!count) {
        return Unexpected(count.error());
    }
    ByteReader in(bytes);
    const bool sameMagic = in.take<Magic>() == magic;
    const auto version = in.take<std::uint32_t>();
    const auto rowSize = in.take<std::uint32_t>();
    const UUID found{in.take<decltype(UUID::bytes)>()};
    CheckedHeader checked;
    checked.header.segment = in.take<std::uint64_t>();
    checked.header.sequence = in.take<std::uint64_t>();
    checked.header.lastEvent = in.take<std::uint64_t>();
    checked.header.lastDocument = in.take<std::uint32_t>();
    checked.sizes.rows = in.take<std::uint32_t>();
    checked.sizes.names = in.take<std::uint32_t>();
    checked.sizes.gaps = in.take<std::uint32_t>();
    const auto block = in.take<std::uint32_t>();
    const auto checksum = in.take<std::uint32_t>();
    if (*count != headerSize || !sameMagic ||
        checksum != crc32c(std::span(bytes).first(headerSize - sizeof checksum))) {
        return Unexpected(damageOf(file.path(), "its header's checksum does not hold"));
    }
    if (version > storeFormatVersion) {
        return Unexpected(laterFormatOf(file.path(), version));
    }
    const auto size = file.size();
    if (!size) {
        return Unexpected(size.error());
    }
    if (found != store || rowSize != sizeof(Row) || block != blockSize ||
        *size != checked.sizes.fileSize() || checked.sizes.gaps > blockSize / sizeof(EventGap)) {
        return Unexpected(damageOf(file.path(), "of a wrong shape"));
    }
    return checked;
}

}  // namespace

Expected<std::uint64_t> writeSnapshot(const std::string& path, const UUID& store,
                                      const SnapshotHeader& header, const Index& index,
                                      const std::vector<EventGap>& gaps) {
    const std::string aside = path + ".new";
    auto file = DiskFile::open(aside, O_RDWR | O_CREAT | O_TRUNC);
    if (!file) {
        return Unexpected(file.error());
    }
    BlockWriter out(std::move(*file));
    const Sizes sizes{index.endOfRows(), index.names().size(),
                      static_cast<std::uint32_t>(gaps.size())};
    auto written = out.write(encodeHeader(store, header, sizes));
    written = written ? writeRows(out, index) : written;
    written = written ? writeNames(out, index.names()) : written;
    written = written ? writeGaps(out, gaps) : written;
    auto bytes = written ? out.finish() : Unexpected(written.error());
    written = bytes ? renameFile(aside, path) : Unexpected(bytes.error());
    if (!written) {
        (void)removeFile(aside);
        return Unexpected(written.error());
    }
    if (auto synced = syncFolder(path.substr(0, path.rfind('/'))); !synced) {
        return Unexpected(synced.error());
    }
    return bytes;
}

Expected<std::optional<LoadedSnapshot>> readSnapshot(const std::string& path, const UUID& store,
                                                     Index& index) {
    const auto file = DiskFile::open(path, O_RDONLY);
    if (!file) {
        if (file.error().code == ENOENT) {
            return std::optional<LoadedSnapshot>();
        }
        return Unexpected(file.error());
    }
    const auto checked = readHeader(*file, store);
    if (!checked) {
        return Unexpected(checked.error());
    }
    BlockReader in(*file, headerSize);
    LoadedSnapshot loaded;
    loaded.header = checked->header;
    loaded.bytes = checked->sizes.fileSize();
    loaded.gaps.resize(checked->sizes.gaps);
    auto read = readRows(in, index, checked->sizes.rows);
    read = read ? readNames(in, index.names(), checked->sizes.names) : read;
    if (read && !loaded.gaps.empty()) {
        read = in.readBlock(std::as_writable_bytes(std::span(loaded.gaps)));
    }
    if (!read) {
        return Unexpected(read.error());
    }
    return std::optional(std::move(loaded));
}

}  // namespace marrowdale::native
