#pragma once

#include <string>
#include <string_view>

namespace marrowdale {

// A fresh folder of its own, gone with all its contents when the object goes, whatever permissions
// the test left behind. Nothing is followed out of it: links are removed, not their targets.
// Failing to make it throws std::system_error, which fails the test.
class TemporaryDirectory {
  public:
    // Below `parent`; by default where temporary files go ($TMPDIR or /tmp).
    explicit TemporaryDirectory(const std::string& parent = {});
    ~TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    // Absolute, without links in it, no "/" at the end.
    [[nodiscard]] const std::string& path() const { return path_; }
    // path() + "/" + name.
    [[nodiscard]] std::string path(std::string_view name) const;

  private:
    std::string path_;
};

}  // namespace marrowdale
