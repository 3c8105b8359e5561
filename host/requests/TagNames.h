#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale::host {

// The names of an item's tags, from its tag data; none where that can't be read.
[[nodiscard]] std::vector<std::string> tagNames(const FileProviderItem& item);

// Tag data of tags with these names and no colour.
// None where a name is no text (UTF-8).
[[nodiscard]] std::optional<Data> tagDataFor(std::span<const std::string> names);

}  // namespace marrowdale::host
