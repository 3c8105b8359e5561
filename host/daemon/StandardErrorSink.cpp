#include "host/daemon/StandardErrorSink.h"

#include <cerrno>
#include <unistd.h>

#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

void StandardErrorSink::write(LogLevel /*level*/, std::string_view line) {
    const std::string text = harmlessLine(line) + "\n";
    std::string_view rest = text;
    while (!rest.empty()) {
        const ssize_t written = ::write(descriptor_, rest.data(), rest.size());
        if (written < 0 && errno != EINTR) {
            return;
        }
        rest.remove_prefix(written < 0 ? 0 : static_cast<std::size_t>(written));
    }
}

}  // namespace marrowdale::host
