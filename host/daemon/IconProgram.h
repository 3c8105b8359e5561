#pragma once

#include <string>

namespace marrowdale::host {

// Where the program that draws icons is installed, seen from this program.
[[nodiscard]] std::string iconProgramPath();

}  // namespace marrowdale::host
