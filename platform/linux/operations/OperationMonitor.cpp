#include "platform/linux/operations/OperationMonitor.h"

#include <utility>

namespace marrowdale::native {

namespace {

std::shared_ptr<OperationMonitor>& monitorOfThisThread() {
    thread_local std::shared_ptr<OperationMonitor> monitor;
    return monitor;
}

}  // namespace

ScopedOperationMonitor::ScopedOperationMonitor(std::shared_ptr<OperationMonitor> monitor)
    : outer_(std::exchange(monitorOfThisThread(), std::move(monitor))) {}

ScopedOperationMonitor::~ScopedOperationMonitor() {
    monitorOfThisThread() = std::move(outer_);
}

std::shared_ptr<OperationMonitor> ScopedOperationMonitor::current() {
    return monitorOfThisThread();
}

}  // namespace marrowdale::native
