#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"

namespace marrowdale {

// A tag as it travels between provider and host.
struct Tag {
    std::string label;
    std::uint64_t color = 0;
    friend bool operator==(const Tag&, const Tag&) = default;
};

// A binary property list: an array of dictionaries with "label" (string) and "color" (integer).
// Fails (POSIX EINVAL) for a label that is not UTF-8.
[[nodiscard]] Expected<Data> encodeTagData(const std::vector<Tag>& tags);
// Fails (POSIX EBADMSG) for anything else than what encodeTagData makes; more keys are passed over.
[[nodiscard]] Expected<std::vector<Tag>> decodeTagData(const Data& data);

}  // namespace marrowdale
