#include "host/daemon/HostService.h"

namespace marrowdale::host {

Started<std::unique_ptr<HostService>> HostService::start(WorldOptions options) {
    options.recording = native::StoreOptions::Recording::live;
    auto world = World::open(options);
    if (!world) {
        return std::unexpected(std::move(world.error()));
    }
    std::unique_ptr<HostService> service(new HostService(std::move(*world)));
    service->server_ = HttpServer::start(
        [&api = service->api_](ApiRequest request, std::shared_ptr<ApiReply> reply) {
            api.handle(request, reply);
        });
    if (auto listening = service->server_->listenInFolder(options.settings.stateFolder);
        !listening) {
        return std::unexpected(StartFailure::from(std::move(listening.error())));
    }
    return service;
}

}  // namespace marrowdale::host
