#pragma once

#include <string>
#include <vector>

#include "benchmarks/Measurement.h"

namespace marrowdale::benchmarks {

// Runs another program to its end, its output thrown away, and says how long that took. Throws
// when it can't be started or fails.
[[nodiscard]] Duration runPeer(const std::vector<std::string>& arguments);

// Whether there is such a program on the search path.
[[nodiscard]] bool hasPeer(const std::string& program);

// Each line that the program writes.
[[nodiscard]] std::vector<std::string> outputOf(const std::vector<std::string>& arguments);

}  // namespace marrowdale::benchmarks
