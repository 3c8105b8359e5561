#include "platform/linux/store/StoreHead.h"

#include <fcntl.h>

#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/Envelope.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

constexpr Magic magic{'M', 'W', 'h', 'e', 'a', 'd', '0', '1'};

}  // namespace

Expected<StoreHead> StoreHead::create(const std::string& path, const UUID& store,
                                      const LogPosition& position) {
    auto file = DiskFile::open(path, O_RDWR | O_CREAT | O_TRUNC);
    if (!file) {
        return Unexpected(file.error());
    }
    StoreHead head;
    head.file_ = std::move(*file);
    head.store_ = store;
    if (auto written = head.write(position); !written) {
        return Unexpected(written.error());
    }
    return head;
}

Expected<StoreHead> StoreHead::open(const std::string& path, const UUID& store) {
    auto file = DiskFile::open(path, O_RDWR);
    if (!file) {
        return Unexpected(missingIsDamage(file.error(), path));
    }
    const auto envelope = readEnvelope(*file, magic);
    if (!envelope) {
        return Unexpected(envelope.error());
    }
    ByteReader body(envelope->body);
    StoreHead head;
    head.position_.segment = body.take<std::uint64_t>();
    head.position_.offset = body.take<std::uint64_t>();
    head.position_.sequence = body.take<std::uint64_t>();
    head.position_.lastEvent = body.take<std::uint64_t>();
    head.position_.lastDocument = body.take<std::uint32_t>();
    (void)body.take<std::uint32_t>();
    if (!body.finished() || envelope->store != store) {
        return Unexpected(damageOf(path, "not of this store"));
    }
    head.file_ = std::move(*file);
    head.store_ = store;
    return head;
}

Expected<void> StoreHead::write(const LogPosition& position) {
    ByteWriter body;
    body.put(position.segment);
    body.put(position.offset);
    body.put(position.sequence);
    body.put(position.lastEvent);
    body.put(position.lastDocument);
    body.put(std::uint32_t{0});
    position_ = position;
    return file_.write(encodeEnvelope(magic, store_, body.bytes()), 0);
}

}  // namespace marrowdale::native
