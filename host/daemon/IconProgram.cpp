#include "host/daemon/IconProgram.h"

#include <filesystem>
#include <system_error>

namespace marrowdale::host {

std::string iconProgramPath() {
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    return (program.parent_path().parent_path() / "libexec/marrowdale/marrowdale-render-icon")
        .string();
}

}  // namespace marrowdale::host
