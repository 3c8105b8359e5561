#include "host/daemon/ServiceNotification.h"

#include <algorithm>
#include <cstddef>
#include <sys/socket.h>
#include <sys/un.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

void notifyServiceManager(const Environment& environment, std::string_view state) {
    const auto path = environment.variable("NOTIFY_SOCKET");
    sockaddr_un address{};
    if (!path || path->size() >= sizeof address.sun_path) {
        return;
    }
    address.sun_family = AF_UNIX;
    std::ranges::copy(*path, std::begin(address.sun_path));
    // An abstract address is written with "@" for its first, null byte.
    if (address.sun_path[0] == '@') {
        address.sun_path[0] = '\0';
    }
    const native::UniqueFD socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path->size());
    // A manager that does not listen any more is none to tell.
    [[maybe_unused]] const ssize_t sent =
        ::sendto(socket.get(), state.data(), state.size(), MSG_NOSIGNAL,
                 reinterpret_cast<const sockaddr*>(&address), length);
}

}  // namespace marrowdale::host
