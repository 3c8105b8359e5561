#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale::native {

// The name extensions that make a folder a package: one document to its reader. Immutable; any
// thread.
class PackageTypes {
  public:
    // The extensions that are packages whatever applications say.
    [[nodiscard]] static std::span<const std::string_view> shipped();

    // The shipped extensions and `declared` (without the dot; letters of either case).
    explicit PackageTypes(std::span<const std::string> declared = {});

    // Whether a folder of that name is a package. A name that begins with its only dot has no
    // extension.
    [[nodiscard]] bool isPackageName(std::string_view name) const;

    // All of them, in lower case, sorted.
    [[nodiscard]] const std::vector<std::string>& extensions() const { return extensions_; }

  private:
    std::vector<std::string> extensions_;
    std::size_t longest_ = 0;
};

}  // namespace marrowdale::native
