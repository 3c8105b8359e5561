#include "host/requests/SocketPlace.h"

#include <cerrno>
#include <fcntl.h>

namespace marrowdale::host {

Expected<SocketPlace> SocketPlace::in(const std::string& folder) {
    native::UniqueFD opened(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!opened) {
        return Unexpected(errorWithPOSIXCode(errno, "open", folder));
    }
    return SocketPlace(std::move(opened));
}

std::string SocketPlace::pathOf(const std::string& name) const {
    return "/proc/self/fd/" + std::to_string(folder_.get()) + "/" + name;
}

}  // namespace marrowdale::host
