#pragma once

#include <string>
#include <sys/mount.h>
#include <utility>

namespace marrowdale {

// Something mounted on a folder or file for as long as the object lives. False where it could not
// be mounted: only root may.
class ScopedMount {
  public:
    // A fresh, empty file system in memory; `options` as mount(8) has them ("size=1m").
    [[nodiscard]] static ScopedMount memory(const std::string& target,
                                            const char* options = nullptr) {
        return {::mount("none", target.c_str(), "tmpfs", 0, options), target};
    }
    [[nodiscard]] static ScopedMount bind(const std::string& source, const std::string& target) {
        return {::mount(source.c_str(), target.c_str(), nullptr, MS_BIND, nullptr), target};
    }
    // Merged folders; `options` names them, as mount(8) has it.
    [[nodiscard]] static ScopedMount overlay(const std::string& target,
                                             const std::string& options) {
        return {::mount("none", target.c_str(), "overlay", 0, options.c_str()), target};
    }

    ScopedMount(ScopedMount&& other) noexcept : target_(std::exchange(other.target_, {})) {}
    ScopedMount& operator=(ScopedMount&&) = delete;
    ~ScopedMount() {
        if (!target_.empty()) {
            ::umount2(target_.c_str(), MNT_DETACH | UMOUNT_NOFOLLOW);
        }
    }

    explicit operator bool() const { return !target_.empty(); }

  private:
    ScopedMount(int result, const std::string& target) : target_(result == 0 ? target : "") {}

    std::string target_;  // empty: nothing is mounted
};

}  // namespace marrowdale
