#include "platform/linux/store/Envelope.h"

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

constexpr std::size_t headerSize = 32;
constexpr std::size_t checksumSize = 4;
constexpr std::size_t largest = 1U << 16U;

bool checksumHolds(std::span<const std::byte> bytes) {
    ByteReader tail(bytes.last(checksumSize));
    return crc32c(bytes.first(bytes.size() - checksumSize)) == tail.take<std::uint32_t>();
}

}  // namespace

std::vector<std::byte> encodeEnvelope(const Magic& magic, const UUID& store,
                                      std::span<const std::byte> body) {
    ByteWriter out;
    out.put(magic);
    out.put(storeFormatVersion);
    out.put(static_cast<std::uint32_t>(body.size()));
    out.put(store.bytes);
    out.append(body);
    out.put(crc32c(out.bytes()));
    return {out.bytes().begin(), out.bytes().end()};
}

Expected<Envelope> readEnvelope(const DiskFile& file, const Magic& magic) {
    const auto bytes = file.readWhole(largest);
    if (!bytes) {
        return Unexpected(bytes.error().code == EFBIG ? damageOf(file.path(), "too long")
                                                      : bytes.error());
    }
    if (bytes->size() < headerSize + checksumSize) {
        return Unexpected(damageOf(file.path(), "cut off"));
    }
    ByteReader in(*bytes);
    const bool sameMagic = in.take<Magic>() == magic;
    const auto version = in.take<std::uint32_t>();
    const auto length = in.take<std::uint32_t>();
    if (!sameMagic || !checksumHolds(*bytes)) {
        return Unexpected(damageOf(file.path(), "its checksum does not hold"));
    }
    if (version > storeFormatVersion) {
        return Unexpected(laterFormatOf(file.path(), version));
    }
    if (length != bytes->size() - headerSize - checksumSize) {
        return Unexpected(damageOf(file.path(), "of a wrong length"));
    }
    Envelope envelope;
    envelope.store.bytes = in.take<decltype(UUID::bytes)>();
    const auto body = in.takeBytes(length);
    envelope.body.assign(body.begin(), body.end());
    return envelope;
}

}  // namespace marrowdale::native
