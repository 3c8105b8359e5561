#include "host/daemon/ReadableSize.h"

#include <array>
#include <cstddef>
#include <string_view>

#include <fmt/format.h>

namespace marrowdale::host {

std::string readableSize(std::uint64_t bytes) {
    constexpr std::array<std::string_view, 7> units{"B", "kB", "MB", "GB", "TB", "PB", "EB"};
    if (bytes < 1000) {
        return fmt::format("{} B", bytes);
    }
    auto value = static_cast<double>(bytes);
    std::size_t unit = 0;
    // What would be shown as 1000 is shown as 1.0 of the next unit.
    while (value >= 999.5 && unit + 1 < units.size()) {
        value /= 1000;
        ++unit;
    }
    return value < 9.95 ? fmt::format("{:.1f} {}", value, units.at(unit))
                        : fmt::format("{:.0f} {}", value, units.at(unit));
}

}  // namespace marrowdale::host
