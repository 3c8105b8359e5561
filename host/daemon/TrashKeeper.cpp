#include "host/daemon/TrashKeeper.h"

namespace marrowdale::host {

namespace {

class SilentObserver final : public ActionObserver {
  public:
    void progressed(const ActionProgress& /*progress*/) override {}
    void warned(const std::string& /*text*/) override {}
};

}  // namespace

TrashKeeper::TrashKeeper(ActionRequests& requests, Options options)
    : requests_(requests), options_(std::move(options)), thread_([this] { run(); }) {}

TrashKeeper::~TrashKeeper() {
    {
        const MutexLock lock(mutex_);
        isEnding_ = true;
    }
    changed_.notifyAll();
    thread_.join();
}

void TrashKeeper::run() {
    do {
        purge();
    } while (waitForTheNext());
}

void TrashKeeper::purge() {
    ItemAction action;
    action.kind = ItemAction::Kind::purge;
    action.date = Date::now();
    action.date->seconds -= std::chrono::seconds(options_.age).count();
    SilentObserver observer;
    if (const auto purged = requests_.perform(action, observer, {}); !purged) {
        options_.failed(purged.error());
    }
}

bool TrashKeeper::waitForTheNext() {
    const auto next = Clock::now() + options_.pause;
    MutexLock lock(mutex_);
    while (!isEnding_ && changed_.waitUntil(lock, next)) {
    }
    return !isEnding_;
}

}  // namespace marrowdale::host
