#include "platform/linux/operations/OperationRun.h"

#include <cerrno>

namespace marrowdale::native {

Expected<void> OperationRun::checkpoint(std::string_view operation,
                                        std::string_view subject) const {
    const bool isCancelled = canBeCancelled_ && monitor_ && monitor_->isCancelled();
    if (isCancelled || stopping_) {
        return Unexpected(errorWithPOSIXCode(ECANCELED, operation, subject));
    }
    return {};
}

void OperationRun::warn(const std::string& text) const {
    if (log_ != nullptr) {
        log_->error(text);
    }
    if (monitor_) {
        monitor_->warned(text);
    }
}

}  // namespace marrowdale::native
