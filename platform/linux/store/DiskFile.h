#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// One open file of the store. Every error carries the operation and the path. One thread.
class DiskFile {
  public:
    DiskFile() = default;

    // `flags` as for open(2), O_CLOEXEC and O_NOFOLLOW added; new files get mode 0600.
    [[nodiscard]] static Expected<DiskFile> open(const std::string& path, int flags);

    explicit operator bool() const { return static_cast<bool>(descriptor_); }
    [[nodiscard]] const std::string& path() const { return path_; }
    [[nodiscard]] int descriptor() const { return descriptor_.get(); }

    [[nodiscard]] Expected<std::uint64_t> size() const;
    // How many bytes were read: fewer than asked only at the end of the file.
    [[nodiscard]] Expected<std::size_t> read(std::span<std::byte> into, std::uint64_t offset) const;
    // All of the file; EFBIG when it is longer than `limit`.
    [[nodiscard]] Expected<std::vector<std::byte>> readWhole(std::size_t limit) const;
    // All of it or an error (part of it may have been written then).
    [[nodiscard]] Expected<void> write(std::span<const std::byte> bytes,
                                       std::uint64_t offset) const;
    [[nodiscard]] Expected<void> truncate(std::uint64_t length) const;
    // Contents and length are on the disk when it returns.
    [[nodiscard]] Expected<void> sync() const;

  private:
    DiskFile(UniqueFD descriptor, std::string path)
        : descriptor_(std::move(descriptor)), path_(std::move(path)) {}
    UniqueFD descriptor_;
    std::string path_;
};

// Makes what was made, renamed or removed in the folder lasting.
[[nodiscard]] Expected<void> syncFolder(const std::string& path);
[[nodiscard]] Expected<void> renameFile(const std::string& from, const std::string& to);
// Success when it is not there.
[[nodiscard]] Expected<void> removeFile(const std::string& path);
// Removes a folder with all that is in it; links are removed, not followed. Success when it is not
// there.
[[nodiscard]] Expected<void> removeTree(const std::string& path);
// Makes the folder (mode 0700) and those above it that are missing.
[[nodiscard]] Expected<void> makeFolders(const std::string& path);
// The names in a folder, sorted.
[[nodiscard]] Expected<std::vector<std::string>> namesIn(const std::string& path);

}  // namespace marrowdale::native
