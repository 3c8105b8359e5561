#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "platform/foundation/Error.h"
#include "platform/foundation/Log.h"
#include "platform/linux/operations/OperationMonitor.h"

namespace marrowdale::native {

// One operation under way: what it tells its monitor, and whether it should end. One thread.
class OperationRun {
  public:
    // `stopping` is set when the whole service ends.
    OperationRun(OperationProgress::Kind kind, std::shared_ptr<OperationMonitor> monitor,
                 const std::atomic<bool>& stopping, Log* log)
        : monitor_(std::move(monitor)), stopping_(stopping), log_(log) {
        progress_.kind = kind;
    }

    void expectBytes(std::uint64_t total) { progress_.totalBytes = total; }
    void didEntry() {
        ++progress_.entries;
        tell();
    }
    void didBytes(std::uint64_t count) {
        progress_.bytes += count;
        tell();
    }
    // Past what can be undone; from here on only the end of the service stops the work.
    void passPointOfNoReturn() { canBeCancelled_ = false; }
    // ECANCELED when the work should end.
    [[nodiscard]] Expected<void> checkpoint(std::string_view operation,
                                            std::string_view subject) const;
    void warn(const std::string& text) const;

  private:
    void tell() const {
        if (monitor_) {
            monitor_->progressed(progress_);
        }
    }

    OperationProgress progress_;
    std::shared_ptr<OperationMonitor> monitor_;
    const std::atomic<bool>& stopping_;
    Log* log_;
    bool canBeCancelled_ = true;
};

}  // namespace marrowdale::native
