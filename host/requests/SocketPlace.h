#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

// The name of the service's socket in the state folder.
inline constexpr const char* socketName = "socket";

// A path by which a socket in a folder can be bound and connected to, however long the folder's own
// path is (an address has room for 107 bytes): through the open folder. Good as long as this is.
class SocketPlace {
  public:
    // Errors: the folder can't be opened.
    [[nodiscard]] static Expected<SocketPlace> in(const std::string& folder);

    [[nodiscard]] std::string pathOf(const std::string& name) const;
    [[nodiscard]] int folder() const { return folder_.get(); }

  private:
    explicit SocketPlace(native::UniqueFD folder) : folder_(std::move(folder)) {}
    native::UniqueFD folder_;
};

}  // namespace marrowdale::host
