#pragma once

#include <span>
#include <string>
#include <vector>

#include "platform/Platform.h"

// One look at an item, from which its record is made with no more calls. Whoever is to tell of an
// item as it is now looks first, and makes the item of the URL that the look answers; a URL that a
// listing handed out needs none.

namespace marrowdale {

// The extended attributes that a listing or a look brings along for the items' sake.
[[nodiscard]] std::vector<std::string> listedAttributeNames();

// The URLs with all that items are made of; see FileSystem::lookAt. What is asked of them is
// answered from that look for as long as they live, so they are not kept.
[[nodiscard]] std::vector<Expected<URL>> looksAt(const Platform& platform,
                                                 std::span<const URL> urls);
// The same for one. An item that can't be looked at is answered as the bare URL, so that whoever
// makes an item of it finds out why and says so.
[[nodiscard]] URL lookedAt(const Platform& platform, const URL& url);

}  // namespace marrowdale
