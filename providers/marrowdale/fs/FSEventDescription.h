#pragma once

#include <cstdint>
#include <string>

#include "platform/services/FileEventService.h"
#include "providers/marrowdale/fs/DocIDChangePath.h"

// Events as text, for log lines. Any thread.

namespace marrowdale {

// The names of the bits, lowest first, with "/" between them; at the end, as one hexadecimal
// number, those that have no name. Empty for none.
[[nodiscard]] std::string flagNames(std::uint32_t flags);

// (FLAGS) "PATH" fileID:NUMBER eventID:NUMBER, "unspecified" in place of a file ID that the event
// does not have, and an empty path where it has none.
[[nodiscard]] std::string description(const FileEvent& event);

// <docID:NUMBER src:NUMBER dst:NUMBER>
[[nodiscard]] std::string description(const DocIDChange& change);

}  // namespace marrowdale
