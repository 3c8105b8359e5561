#pragma once

#include <atomic>
#include <memory>

#include "host/daemon/Api.h"
#include "host/daemon/HttpServer.h"
#include "host/daemon/World.h"
#include "platform/foundation/SerialQueue.h"

namespace marrowdale::host {

// A provider that other processes can talk to: a world that records what happens, the socket in its
// state folder, and a replica that follows. Threads: the requests may be made from any.
class HostService {
  public:
    // Fails as World::open does, and when the socket can't be made. `options.recording` is live.
    [[nodiscard]] static Started<std::unique_ptr<HostService>> start(WorldOptions options);
    // The same in two steps, for those who have something to add before anybody else can ask:
    // nobody is answered until `listen` was called, once.
    [[nodiscard]] static Started<std::unique_ptr<HostService>> prepare(WorldOptions options);
    [[nodiscard]] Started<void> listen();

    [[nodiscard]] LocalRequests& requests() { return world_->requests(); }
    // What answers programs, for those who take their requests in another way.
    [[nodiscard]] Api& api() { return api_; }
    [[nodiscard]] const Settings& settings() const { return world_->settings(); }
    [[nodiscard]] Log& log() const { return world_->log(); }

  private:
    explicit HostService(std::unique_ptr<World> world)
        : world_(std::move(world)), api_(world_->requests()) {}

    [[nodiscard]] Expected<void> startReplica();
    void replicaIsDue();

    std::unique_ptr<World> world_;
    Api api_;
    std::atomic<bool> isReplicaDue_ = false;
    SerialQueue replicaQueue_{"marrowdale.host.replica"};
    std::unique_ptr<LocalRequests::Watch> replicaWatch_;  // uses the two above
    std::unique_ptr<HttpServer> server_;                  // goes first
};

}  // namespace marrowdale::host
