#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <fcntl.h>
#include <string_view>

#include "platform/foundation/Error.h"

namespace marrowdale::native {

// The kernel's handle of a file: what names it on its file system through every rename, and is
// never given to another file, for it holds the generation of the inode number too.
class FileHandle {
  public:
    // The handle's type (four bytes) and its own bytes behind it, as the kernel lays them out
    // wherever it tells of a handle. Handles are the same when these are.
    [[nodiscard]] std::string_view bytes() const;
    [[nodiscard]] std::uint32_t fingerprint() const;

  private:
    friend Expected<FileHandle> fileHandle(int directory, const char* name, int flags);

    // The kernel's file_handle with room for every handle there is.
    alignas(::file_handle) std::array<char, sizeof(::file_handle) + MAX_HANDLE_SZ> room_{};
};

// The handle of `name` in the open folder `directory` (AT_FDCWD for an absolute path; an empty name
// for the open file itself); links are not followed. `flags`: of name_to_handle_at besides. Errors:
// POSIX; EOPNOTSUPP where the file system gives none.
[[nodiscard]] Expected<FileHandle> fileHandle(int directory, const char* name, int flags = 0);

// A short number made of `bytes` (FileHandle::bytes), never 0. Two handles that differ in one word
// (the generation of a reused inode number) never have the same.
[[nodiscard]] std::uint32_t fingerprintOfHandle(std::string_view bytes);

}  // namespace marrowdale::native
