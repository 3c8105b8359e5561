#include "host/cli/Output.h"

#include <cerrno>
#include <unistd.h>

namespace marrowdale::host {

namespace {
constexpr std::size_t pieceSize = 64U << 10U;
}

void Output::write(std::string_view text) {
    if (hasFailed()) {
        return;
    }
    pending_ += text;
    if (pending_.size() >= pieceSize) {
        flush();
    }
}

void Output::flush() {
    std::string_view rest = pending_;
    while (!rest.empty() && !hasFailed()) {
        const ssize_t written = ::write(descriptor_, rest.data(), rest.size());
        if (written >= 0) {
            rest.remove_prefix(static_cast<std::size_t>(written));
        } else if (errno != EINTR) {
            code_ = errno;
        }
    }
    pending_.clear();
}

bool Output::readerHasGone() const {
    return code_ == EPIPE;
}

int Output::error() const {
    return readerHasGone() ? 0 : code_;
}

}  // namespace marrowdale::host
