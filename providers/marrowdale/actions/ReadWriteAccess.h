#pragma once

#include <functional>

#include "platform/Platform.h"

namespace marrowdale {

// Runs the block on the item itself, opened so that its attributes can be changed, and passes its
// result on: a system error number, 0 on success. Where it can't be opened so, the block is not run
// and the result is why.
[[nodiscard]] int withReadWriteAccess(const Platform& platform, const URL& url,
                                      const std::function<int(const OpenFile&)>& block);

}  // namespace marrowdale
