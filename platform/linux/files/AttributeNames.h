#pragma once

#include <string>
#include <string_view>

namespace marrowdale::native {

// Where ordinary users' attributes live on Linux. The attribute "x" is stored as "user.x"; this is
// the one place that knows.
inline constexpr std::string_view attributePrefix = "user.";

[[nodiscard]] inline std::string systemAttributeName(std::string_view name) {
    return std::string(attributePrefix).append(name);
}

}  // namespace marrowdale::native
