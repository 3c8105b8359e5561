#include "host/daemon/SignalHub.h"

#include <algorithm>

namespace marrowdale::host {

SignalHub::SignalHub(std::chrono::milliseconds pause) : pause_(pause), thread_([this] { run(); }) {}

SignalHub::~SignalHub() {
    {
        const MutexLock lock(mutex_);
        isEnding_ = true;
    }
    changed_.notifyAll();
    thread_.join();
}

void SignalHub::signal(std::string_view container) {
    {
        const MutexLock lock(mutex_);
        if (pending_.contains(container)) {
            return;
        }
        const auto found = notBefore_.find(container);
        pending_.emplace(container, found == notBefore_.end() ? Clock::now() : found->second);
    }
    changed_.notifyAll();
}

std::unique_ptr<SignalHub::Subscription> SignalHub::subscribe(SignalTaker taker) {
    const MutexLock lock(takersMutex_);
    takers_.emplace(++lastNumber_, std::move(taker));
    return std::make_unique<Subscription>(*this, lastNumber_);
}

void SignalHub::remove(std::uint64_t number) {
    const MutexLock lock(takersMutex_);
    takers_.erase(number);
}

void SignalHub::run() {
    while (true) {
        const std::string container = nextDue();
        if (container.empty()) {
            return;
        }
        deliver(container);
    }
}

std::string SignalHub::nextDue() {
    MutexLock lock(mutex_);
    while (!isEnding_) {
        if (std::string container = takeDue(); !container.empty()) {
            return container;
        }
        if (pending_.empty()) {
            changed_.wait(lock);
        } else {
            const auto earliest = std::ranges::min_element(
                pending_, {}, [](const auto& entry) { return entry.second; });
            std::ignore = changed_.waitUntil(lock, earliest->second);
        }
    }
    return {};
}

std::string SignalHub::takeDue() {
    const auto now = Clock::now();
    const auto due =
        std::ranges::find_if(pending_, [&](const auto& entry) { return entry.second <= now; });
    if (due == pending_.end()) {
        return {};
    }
    std::string container = due->first;
    pending_.erase(due);
    notBefore_[container] = now + pause_;
    return container;
}

void SignalHub::deliver(const std::string& container) {
    const MutexLock lock(takersMutex_);
    for (const auto& [number, taker] : takers_) {
        taker(container);
    }
}

}  // namespace marrowdale::host
