#pragma once

#include <cstddef>
#include <memory>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/services/FileSystem.h"

namespace marrowdale {

// Extended attributes of files. Names come without the system's prefix, which is put in front and
// taken off in this service alone. Values are whole. Any thread. Errors: POSIX; ENODATA is
// "attribute not found", ENOTSUP a file system (or kind of file) that keeps no such attributes.
class ExtendedAttributes {
  public:
    virtual ~ExtendedAttributes() = default;

    // The size of a value, of the item itself (a final link is not followed). From what a listing
    // learnt, when the URL comes from one.
    [[nodiscard]] virtual Expected<std::size_t> size(const URL& url, std::string_view name) = 0;
    // The value; at most `room` bytes of it are expected, and a value that has grown since the size
    // was asked is ERANGE.
    [[nodiscard]] virtual Expected<Data> read(const URL& url, std::string_view name,
                                              std::size_t room) = 0;
    // Replaces any earlier value.
    [[nodiscard]] virtual Expected<void> set(const OpenFile& file, std::string_view name,
                                             const Data& value) = 0;
    [[nodiscard]] virtual Expected<void> remove(const OpenFile& file, std::string_view name) = 0;
};

// Opens files for changing their metadata.
class WriteAccess {
  public:
    virtual ~WriteAccess() = default;
    // Opens the item itself (never a link's target, nothing is waited for) so that its attributes
    // can be set, and looks at what was opened: only regular files and folders are. EACCES and
    // EROFS come as errorFileWriteNoPermission(); everything else as POSIX errors.
    [[nodiscard]] virtual Expected<std::unique_ptr<OpenFile>> openForWriting(const URL& url) = 0;
};

}  // namespace marrowdale
