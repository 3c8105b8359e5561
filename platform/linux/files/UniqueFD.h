#pragma once

#include <unistd.h>
#include <utility>

namespace marrowdale::native {

// Owns a file descriptor; closes it when it goes.
class UniqueFD {
  public:
    UniqueFD() = default;
    explicit UniqueFD(int descriptor) : descriptor_(descriptor) {}
    UniqueFD(UniqueFD&& other) noexcept : descriptor_(other.release()) {}
    UniqueFD& operator=(UniqueFD&& other) noexcept {
        if (this != &other) {
            reset(other.release());
        }
        return *this;
    }
    UniqueFD(const UniqueFD&) = delete;
    UniqueFD& operator=(const UniqueFD&) = delete;
    ~UniqueFD() { reset(); }

    [[nodiscard]] int get() const { return descriptor_; }
    explicit operator bool() const { return descriptor_ >= 0; }
    [[nodiscard]] int release() { return std::exchange(descriptor_, -1); }
    void reset(int descriptor = -1) {
        if (descriptor_ >= 0) {
            ::close(descriptor_);
        }
        descriptor_ = descriptor;
    }

  private:
    int descriptor_ = -1;
};

}  // namespace marrowdale::native
