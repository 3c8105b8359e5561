#include "platform/foundation/FatalError.h"

#include <cstdio>
#include <cstdlib>

namespace marrowdale {

void fatalError(std::string_view message) noexcept {
    std::fputs("fatal: ", stderr);
    std::fwrite(message.data(), 1, message.size(), stderr);
    std::fputc('\n', stderr);
    std::fflush(stderr);
    std::abort();
}

}  // namespace marrowdale
