#pragma once

#include <cstdint>
#include <expected>
#include <string>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"

namespace marrowdale {

// The payload of every page token and of every sync anchor: on which volume a listing or a feed of
// changes was made, from which event it goes on, how far a listing has got, and which generation of
// the app libraries its holder has seen. The host keeps the encoded bytes and hands them back.
//
// Encoded as a binary property list: a dictionary whose keys are exactly the field names, integers
// as integers, the UUID in its textual form.
struct FSChangeToken {
    std::uint64_t version = 0;
    UUID deviceUUID{};
    std::uint64_t streamEventID = 0;
    std::uint64_t offset = 0;  // walked entries that were already delivered
    std::uint64_t appLibraryVersionToken = 0;

    friend bool operator==(const FSChangeToken&, const FSChangeToken&) = default;

    [[nodiscard]] Data encode() const;

    // Refuses data of exactly 48 bytes without looking at it, whatever is no property list, and a
    // list that lacks a key or has another type for it. The error is POSIX EBADMSG; its holder can
    // only start over, so it is told nothing finer.
    [[nodiscard]] static Expected<FSChangeToken> decode(const Data& data);

    // All five fields, for log lines.
    [[nodiscard]] std::string description() const;
};

}  // namespace marrowdale
