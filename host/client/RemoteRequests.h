#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>

#include "host/client/HttpConnection.h"
#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Requests to a host in another process: the service that has a state folder. One request at a
// time travels on the connection; `watch` opens one of its own.
class RemoteRequests final : public HostRequests {
  public:
    // Connects, and sees that the service answers. Errors: see HttpConnection; EPROTO for a service
    // of another version of the interface.
    [[nodiscard]] static Expected<std::unique_ptr<RemoteRequests>> connect(
        const std::string& stateFolder);

    // "process 12".
    [[nodiscard]] std::string serviceProcess() const {
        return "process " + std::to_string(processID_);
    }

    [[nodiscard]] Expected<FileProviderItemPtr> item(std::string_view identifier) override;
    [[nodiscard]] Expected<std::string> identifierAt(std::string_view path) override;
    [[nodiscard]] Expected<std::string> pathOf(std::string_view identifier) override;
    [[nodiscard]] Expected<std::unique_ptr<ItemListing>> listing(
        std::string_view container) override;

    [[nodiscard]] Expected<std::optional<Data>> anchor(std::string_view container) override;
    [[nodiscard]] Expected<ItemChanges> changes(std::string_view container,
                                                const Data& since) override;
    [[nodiscard]] Expected<void> watch(const std::vector<std::string>& containers,
                                       const std::function<void()>& ready, const SignalTaker& taker,
                                       std::stop_token stop) override;

    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> search(
        const std::vector<std::string>& words) override;
    [[nodiscard]] Expected<FileProviderItemPtr> perform(const ItemAction& action,
                                                        ActionObserver& observer,
                                                        const std::stop_token& stop) override;
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> appLibraries() override;
    [[nodiscard]] Expected<FileProviderItemPtr> applicationContainer(
        std::string_view bundleIdentifier) override;
    [[nodiscard]] Expected<void> refreshApplications() override;
    [[nodiscard]] Expected<std::vector<Thumbnail>> thumbnails(
        const std::vector<std::string>& identifiers) override;
    [[nodiscard]] Expected<std::vector<Finding>> findings() override;

    // Where the service's document browser is, for one web browser. ENXIO where it has none.
    [[nodiscard]] Expected<std::string> newBrowserAddress();

  private:
    class Listing;
    RemoteRequests(std::string stateFolder, std::unique_ptr<HttpConnection> connection)
        : stateFolder_(std::move(stateFolder)), connection_(std::move(connection)) {}

    // The body of a good answer; the service's error otherwise.
    [[nodiscard]] Expected<std::string> get(std::string target);
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> itemsAt(std::string target);
    [[nodiscard]] Expected<std::optional<Data>> thumbnail(std::string_view identifier);

    const std::string stateFolder_;
    std::uint64_t processID_ = 0;
    std::mutex mutex_;
    std::unique_ptr<HttpConnection> connection_;  // guarded by mutex_
};

}  // namespace marrowdale::host
