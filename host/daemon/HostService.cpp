#include "host/daemon/HostService.h"

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

Started<std::unique_ptr<HostService>> HostService::start(WorldOptions options) {
    auto service = prepare(std::move(options));
    if (!service) {
        return service;
    }
    if (auto listening = (*service)->listen(); !listening) {
        return std::unexpected(std::move(listening.error()));
    }
    return service;
}

Started<std::unique_ptr<HostService>> HostService::prepare(WorldOptions options) {
    options.recording = native::StoreOptions::Recording::live;
    auto world = World::open(options);
    if (!world) {
        return std::unexpected(std::move(world.error()));
    }
    std::unique_ptr<HostService> service(new HostService(std::move(*world)));
    if (auto watch = service->startReplica(); !watch) {
        return std::unexpected(StartFailure::from(std::move(watch.error())));
    }
    return service;
}

Started<void> HostService::listen() {
    server_ = HttpServer::start([&api = api_](ApiRequest request, std::shared_ptr<ApiReply> reply) {
        api.handle(request, reply);
    });
    if (auto listening = server_->listenInFolder(settings().stateFolder); !listening) {
        return std::unexpected(StartFailure::from(std::move(listening.error())));
    }
    return {};
}

Expected<void> HostService::startReplica() {
    auto watch =
        requests().startWatch({std::string(VantrelRootContainerItemIdentifier),
                               std::string(VantrelWorkingSetContainerItemIdentifier)},
                              [this](std::string_view container) {
                                  if (container == VantrelWorkingSetContainerItemIdentifier) {
                                      replicaIsDue();
                                  }
                              });
    if (!watch) {
        return Unexpected(watch.error());
    }
    replicaWatch_ = std::move(*watch);
    return {};
}

void HostService::replicaIsDue() {
    if (isReplicaDue_.exchange(true)) {
        return;
    }
    replicaQueue_.async([this] {
        isReplicaDue_ = false;
        if (auto followed = requests().replica().catchUp(); !followed) {
            world_->log().error("can't bring the replica up to date; " +
                                followed.error().description());
        }
    });
}

}  // namespace marrowdale::host
