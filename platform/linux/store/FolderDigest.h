#pragma once

#include <cstdint>

#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// A checksum of what is a folder's own: permissions, owner, group and the user's extended
// attributes. A folder's times tell only that something in it or of it changed; this tells which.
// `folder` is open for reading; where it is -1, or attributes can't be read, they do not count.
// Never 0.
[[nodiscard]] std::uint32_t folderDigest(int folder, const EntryStatus& status);

}  // namespace marrowdale::native
