#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "host/browser/BrowserSite.h"
#include "host/browser/ByteRange.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderItem.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

// A document that is open for reading: a regular file, the one that the item is, reached without
// following a link. What is read is this file, even when another one takes its name meanwhile.
class DocumentFile {
  public:
    // Errors: POSIX; ENOENT where something else has the item's name by now, EINVAL for what is no
    // file (a package, a pipe).
    [[nodiscard]] static Expected<DocumentFile> open(const FileProviderItem& item);

    // What is known of it since it was opened.
    [[nodiscard]] std::uint64_t size() const { return size_; }
    // Changes with the content: a strong entity tag.
    [[nodiscard]] std::string tag() const;
    // As HTTP writes it.
    [[nodiscard]] std::string lastModified() const;

    // Reads that part. A file that has become shorter ends early; what was added is not read.
    [[nodiscard]] std::unique_ptr<ContentSource> read(const ByteRange& range) &&;

  private:
    DocumentFile() = default;
    native::UniqueFD file_;
    std::uint64_t size_ = 0;
    std::uint64_t number_ = 0;
    Date modified_;
};

}  // namespace marrowdale::host
