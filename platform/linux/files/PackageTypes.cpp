#include "platform/linux/files/PackageTypes.h"

#include <algorithm>
#include <array>

namespace marrowdale::native {

namespace {

constexpr std::array<std::string_view, 5> shippedExtensions{"appdir", "bundle", "package",
                                                            "textbundle", "ufo"};

constexpr char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

std::string lowered(std::string_view text) {
    std::string result(text);
    std::ranges::transform(result, result.begin(), lower);
    return result;
}

}  // namespace

std::span<const std::string_view> PackageTypes::shipped() {
    return shippedExtensions;
}

PackageTypes::PackageTypes(std::span<const std::string> declared)
    : extensions_(shippedExtensions.begin(), shippedExtensions.end()) {
    std::ranges::transform(declared, std::back_inserter(extensions_), lowered);
    std::erase(extensions_, std::string());
    std::ranges::sort(extensions_);
    const auto repeated = std::ranges::unique(extensions_);
    extensions_.erase(repeated.begin(), repeated.end());
    for (const std::string& extension : extensions_) {
        longest_ = std::max(longest_, extension.size());
    }
}

bool PackageTypes::isPackageName(std::string_view name) const {
    const std::size_t dot = name.rfind('.');
    if (dot == std::string_view::npos || dot == 0) {
        return false;
    }
    const std::string_view extension = name.substr(dot + 1);
    return extension.size() <= longest_ &&
           std::ranges::any_of(extensions_, [extension](const std::string& declared) {
               return std::ranges::equal(declared, extension, {}, {}, lower);
           });
}

}  // namespace marrowdale::native
