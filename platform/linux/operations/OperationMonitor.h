#pragma once

#include <cstdint>
#include <memory>
#include <string>

namespace marrowdale::native {

// How far an operation on files has got.
struct OperationProgress {
    enum class Kind : std::uint8_t { importing, deleting };
    Kind kind = Kind::importing;
    std::uint64_t entries = 0;     // files and folders done
    std::uint64_t bytes = 0;       // of their contents
    std::uint64_t totalBytes = 0;  // 0 where that is not known: for folders
};

// Somebody who watches an operation, and may cancel it. Called from the operation's threads, often:
// answer at once.
class OperationMonitor {
  public:
    virtual ~OperationMonitor() = default;
    virtual void progressed(const OperationProgress& progress) = 0;
    // Something was left behind that is no failure: one line for people.
    virtual void warned(const std::string& text) = 0;
    // Once true it stays so. The operation ends with ECANCELED and leaves no trace; past the moment
    // in which its outcome shows it runs to its end.
    [[nodiscard]] virtual bool isCancelled() = 0;
};

// Says who watches the operations that are asked for on this thread while the object lives. A
// provider asks for the file work of a request on the thread that made the request, so whoever
// makes requests can watch them without the provider knowing.
class ScopedOperationMonitor {
  public:
    explicit ScopedOperationMonitor(std::shared_ptr<OperationMonitor> monitor);
    ~ScopedOperationMonitor();
    ScopedOperationMonitor(const ScopedOperationMonitor&) = delete;
    ScopedOperationMonitor& operator=(const ScopedOperationMonitor&) = delete;

    // The innermost one of this thread; null when nobody watches.
    [[nodiscard]] static std::shared_ptr<OperationMonitor> current();

  private:
    std::shared_ptr<OperationMonitor> outer_;
};

}  // namespace marrowdale::native
