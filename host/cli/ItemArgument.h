#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "host/daemon/Environment.h"
#include "host/requests/HostRequests.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// An item as somebody names it on the command line: a path that begins with "/", "./" or "../", one
// of the words "root", "working-set" and "all-directories", or an identifier, which is whatever is
// none of these.
class ItemArgument {
  public:
    explicit ItemArgument(std::string text) : text_(std::move(text)) {}

    [[nodiscard]] bool isPath() const;

    // Its identifier. A path is looked up; noSuchItem, with the path as it was typed, when the
    // provider serves nothing there. Words and identifiers are not checked.
    [[nodiscard]] Expected<std::string> identifier(ItemRequests& requests,
                                                   const Environment& environment) const;

  private:
    std::string text_;
};

// The identifier of what stands at a path, which may be relative in any form. The storage root's
// own path, by whatever links it is reached, is the root container's.
[[nodiscard]] Expected<std::string> identifierOfPath(std::string_view path, ItemRequests& requests,
                                                     const Environment& environment);

// The absolute path of the entry itself: folders on the way are resolved as the system resolves
// them, a link at the end is not followed. Where the folder it is in does not exist, the path with
// "." and ".." taken out by name.
[[nodiscard]] std::string entryPath(std::string_view path, const Environment& environment);

// The text with each \udcXX, written out or as the three bytes that encode that surrogate, turned
// into the byte 0xXX, as machine output shows bytes that are no UTF-8. None when it holds no such
// form.
[[nodiscard]] std::optional<std::string> withBytesOfSurrogates(std::string_view text);

}  // namespace marrowdale::host
