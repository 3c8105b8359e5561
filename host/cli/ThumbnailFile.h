#pragma once

#include <string>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// The name of the file for an item's picture: its identifier, with "%2F" and the like for bytes
// that have no place in one name ("/", "%", controls), and ".png".
[[nodiscard]] std::string thumbnailFileName(std::string_view identifier);

// Writes a picture into a folder, which is made when it is missing, and answers its path. What had
// the name is replaced when the picture is whole; a failure leaves it as it was. Errors: POSIX.
[[nodiscard]] Expected<std::string> writeThumbnail(const std::string& folder,
                                                   std::string_view identifier,
                                                   const Data& picture);

}  // namespace marrowdale::host
