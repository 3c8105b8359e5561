#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// Reads the entries of one open folder with getdents64. "." and ".." are left out. One thread.
class DirectoryReader {
  public:
    struct Entry {
        // Good until the next call on the reader; the byte behind it is NUL (`cName()`).
        std::string_view name;
        FileID fileID{};
        std::uint8_t type = 0;      // DT_…; DT_UNKNOWN where the file system does not say
        std::int64_t position = 0;  // where the walk goes on behind this entry; for `seek`

        [[nodiscard]] const char* cName() const { return name.data(); }
    };

    // Takes the folder over. `bufferBytes`: 8 KiB for a page, 256 KiB for a crawl.
    DirectoryReader(UniqueFD folder, std::size_t bufferBytes);
    // The same with a buffer that grows, fourfold each time it was filled, while the reading goes
    // on: cheap for a page, good for a crawl.
    DirectoryReader(UniqueFD folder, std::size_t bufferBytes, std::size_t largestBufferBytes);

    // No value at the end.
    [[nodiscard]] Expected<std::optional<Entry>> next();
    // Goes on behind the entry that had this position; 0 starts over.
    [[nodiscard]] Expected<void> seek(std::int64_t position);
    [[nodiscard]] int descriptor() const { return folder_.get(); }

    // Asks for `isUnchanged`: one more statx a read.
    void trackChanges() { tracksChanges_ = true; }
    // Whether the folder is sure to be as it was when it was last read from: what was read in
    // advance is then what a new read would give, and the folder stands under its name. One statx.
    [[nodiscard]] bool isUnchanged() const;

  private:
    // False at the end.
    [[nodiscard]] Expected<bool> fill();
    void noteChangeTime();

    UniqueFD folder_;
    bool tracksChanges_ = false;
    std::optional<Date> changed_;  // the folder's change time before the last read, when settled
    std::unique_ptr<std::byte[]> buffer_;  // NOLINT(modernize-avoid-c-arrays)
    std::size_t capacity_;
    std::size_t largestCapacity_;
    std::size_t filled_ = 0;
    std::size_t consumed_ = 0;
};

// Opens `path` below the open folder `base` as a folder for reading, following no link anywhere in
// it, never leaving the tree nor going over to another mount; an empty path is `base` itself.
// Errors: ENOTDIR, ELOOP (a link on the way), EXDEV (a way out, or a mount), ENOENT, EACCES.
[[nodiscard]] Expected<UniqueFD> openFolderBeneath(int base, const std::string& path);
// The same as a place to look names up in; it need not be readable.
[[nodiscard]] Expected<UniqueFD> holdFolderBeneath(int base, const std::string& path);
// Opens the folder at an absolute path as a place to look names up in (it need not be readable);
// links are followed.
[[nodiscard]] Expected<UniqueFD> holdFolder(const std::string& path);
// Opens the folder at an absolute path; the last component must be no link.
[[nodiscard]] Expected<UniqueFD> openFolder(const std::string& path);

}  // namespace marrowdale::native
