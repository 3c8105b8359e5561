#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <sys/types.h>

namespace marrowdale::native {

// The system calls that read extended attributes of an entry by its name in an open folder, without
// opening the entry. Links are never followed.
//
// Newer kernels (6.13) have such calls; on older ones a thread of its own goes into the folder
// (with a current directory that it shares with nobody) and uses the calls that take a path. That
// thread is made at construction and joined at the end. Any thread may call; calls that go through
// the worker wait for each other.
class AttributeCalls {
  public:
    enum class Method : std::uint8_t { relativeCalls, worker };

    // The best method of this kernel, or the one that is asked for.
    explicit AttributeCalls(std::optional<Method> method = std::nullopt);
    ~AttributeCalls();
    AttributeCalls(const AttributeCalls&) = delete;
    AttributeCalls& operator=(const AttributeCalls&) = delete;

    // The calls, bound to one folder. Answers are those of listxattr and getxattr, errno included;
    // an empty buffer asks for the size.
    class InFolder {
      public:
        [[nodiscard]] ssize_t list(const char* name, std::span<char> buffer) const;
        [[nodiscard]] ssize_t get(const char* name, const char* attribute,
                                  std::span<std::uint8_t> buffer) const;

      private:
        friend class AttributeCalls;
        enum class How : std::uint8_t { relative, byPath };
        InFolder(int directory, How how, int error)
            : directory_(directory), how_(how), error_(error) {}
        int directory_;
        How how_;
        int error_;  // why the folder can't be reached; 0 when it can
    };

    // Runs `body`, maybe on another thread, before it returns. `directory` may be AT_FDCWD, for
    // absolute paths as names. `body` must not come back here.
    void inFolder(int directory, const std::function<void(const InFolder&)>& body);

    [[nodiscard]] Method method() const { return method_; }

  private:
    class Worker;
    Method method_;
    std::unique_ptr<Worker> worker_;
};

}  // namespace marrowdale::native
