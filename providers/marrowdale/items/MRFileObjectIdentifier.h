#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"

// What URLs and identifiers have to do with each other. No state, any thread; nothing here fails
// towards the host: each operation answers no value (or device 0) after one line in the log.

namespace marrowdale {

// The volume of the item at a URL. The error is POSIX.
[[nodiscard]] Expected<DeviceID> deviceIDWithError(const Platform& platform, const URL& url);
// The same, 0 on failure.
[[nodiscard]] DeviceID deviceID(const Platform& platform, const URL& url);

// The identifier of the item at a URL; none when the URL is outside the served trees or can't be
// looked at. Taken from the values cached on the URL if they are there, and cached there otherwise.
[[nodiscard]] std::optional<std::string> itemIdentifier(const Platform& platform, const URL& url);

// The same for a URL that is known to lie below the storage root or below an app library's folder:
// that it does is not checked again.
[[nodiscard]] std::optional<std::string> itemIdentifierInServedTree(const Platform& platform,
                                                                    const URL& url);

// Where the item of an identifier stands now. The root's constant, "fid=" and "did=" are resolved;
// everything else is refused.
[[nodiscard]] std::optional<URL> fileURLWithItemIdentifier(const Platform& platform,
                                                           std::string_view identifier);
// The file that a "did=" or "fid=" names, wherever it stands; none, and no line in the log, for
// what is neither.
[[nodiscard]] std::optional<FileID> fileWithItemIdentifier(const Platform& platform,
                                                           std::string_view identifier);
// On the storage root's volume.
[[nodiscard]] std::optional<URL> fileURLWithFileIdentifier(const Platform& platform, FileID fileID);
[[nodiscard]] std::optional<URL> _fileURLWithFileIdentifier(const Platform& platform, FileID fileID,
                                                            DeviceID deviceIdentifier);

}  // namespace marrowdale
