#pragma once

#include <optional>

#include "platform/Platform.h"

// What is kept on a trashed item. Failures go to the log alone: an item is trashed where it lies.

namespace marrowdale {

// Says since when the item is in the trash; without a date, takes that away.
void writeTrashDate(const Platform& platform, const URL& url, const std::optional<Date>& date);

// Says on the item at `url` that it came from `source`, by the path below the app library that
// holds `source`.
void writePutBack(const Platform& platform, const URL& source, const URL& url);

}  // namespace marrowdale
