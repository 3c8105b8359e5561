#include "platform/linux/store/IdentifierRange.h"

#include <algorithm>
#include <fcntl.h>
#include <limits>

#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/Envelope.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

constexpr Magic magic{'M', 'W', 'r', 'a', 'n', 'g', 'e', 's'};

std::uint32_t documentsBeyond(std::uint32_t last) {
    const std::uint64_t end = std::uint64_t{last} + IdentifierRange::documentStep;
    return static_cast<std::uint32_t>(
        std::min<std::uint64_t>(end, std::numeric_limits<std::uint32_t>::max()));
}

}  // namespace

Expected<IdentifierRange> IdentifierRange::create(const std::string& path, const UUID& store,
                                                  std::uint64_t lastEvent,
                                                  std::uint32_t lastDocument) {
    auto file = DiskFile::open(path, O_RDWR | O_CREAT | O_TRUNC);
    if (!file) {
        return Unexpected(file.error());
    }
    IdentifierRange range;
    range.file_ = std::move(*file);
    range.store_ = store;
    if (auto written = range.close(lastEvent, lastDocument); !written) {
        return Unexpected(written.error());
    }
    return range;
}

Expected<IdentifierRange> IdentifierRange::open(const std::string& path, const UUID& store) {
    auto file = DiskFile::open(path, O_RDWR);
    if (!file) {
        return Unexpected(missingIsDamage(file.error(), path));
    }
    const auto envelope = readEnvelope(*file, magic);
    if (!envelope) {
        return Unexpected(envelope.error());
    }
    ByteReader body(envelope->body);
    IdentifierRange range;
    range.eventEnd_ = body.take<std::uint64_t>();
    range.documentEnd_ = body.take<std::uint32_t>();
    (void)body.take<std::uint32_t>();
    if (!body.finished() || envelope->store != store) {
        return Unexpected(damageOf(path, "not of this store"));
    }
    range.file_ = std::move(*file);
    range.store_ = store;
    return range;
}

Expected<void> IdentifierRange::reserve(std::uint64_t lastEvent, std::uint32_t lastDocument) {
    if (lastEvent <= eventEnd_ && lastDocument <= documentEnd_) {
        return {};
    }
    const std::uint64_t events = lastEvent > eventEnd_ ? lastEvent + eventStep : eventEnd_;
    const std::uint32_t documents =
        lastDocument > documentEnd_ ? documentsBeyond(lastDocument) : documentEnd_;
    return write(events, documents, false);
}

Expected<void> IdentifierRange::close(std::uint64_t lastEvent, std::uint32_t lastDocument) {
    return write(lastEvent, lastDocument, true);
}

Expected<void> IdentifierRange::write(std::uint64_t eventEnd, std::uint32_t documentEnd,
                                      bool clean) {
    ByteWriter body;
    body.put(eventEnd);
    body.put(documentEnd);
    body.put(std::uint32_t{clean ? 1U : 0U});
    if (auto written = file_.write(encodeEnvelope(magic, store_, body.bytes()), 0); !written) {
        return written;
    }
    if (auto synced = file_.sync(); !synced) {
        return synced;
    }
    eventEnd_ = eventEnd;
    documentEnd_ = documentEnd;
    return {};
}

}  // namespace marrowdale::native
