#include "host/daemon/StopSignals.h"

#include <csignal>
#include <cstdlib>
#include <pthread.h>

#include "platform/foundation/Semaphore.h"

namespace marrowdale::host {

namespace {

sigset_t stopSignals() {
    sigset_t signals{};
    sigemptyset(&signals);
    sigaddset(&signals, SIGINT);
    sigaddset(&signals, SIGTERM);
    return signals;
}

}  // namespace

StopSignals::StopSignals() {
    const sigset_t signals = stopSignals();
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    thread_ = std::thread([this] { run(); });
}

StopSignals::~StopSignals() {
    isEnding_ = true;
    ::pthread_kill(thread_.native_handle(), SIGTERM);
    thread_.join();
}

void StopSignals::run() {
    const sigset_t signals = stopSignals();
    while (!isEnding_) {
        int number = 0;
        ::sigwait(&signals, &number);
        if (isEnding_) {
            return;
        }
        if (!hasBegun_) {
            std::_Exit(EXIT_SUCCESS);
        }
        stop_.request_stop();
    }
}

void StopSignals::wait() const {
    Semaphore stopped;
    const std::stop_callback stopper(stop_.get_token(), [&] { stopped.signal(); });
    stopped.wait();
}

}  // namespace marrowdale::host
