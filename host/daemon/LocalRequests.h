#pragma once

#include <functional>
#include <string>

#include "host/daemon/LocalActions.h"
#include "host/daemon/ReplicaKeeper.h"
#include "host/daemon/SignalHub.h"
#include "host/requests/HostRequests.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// What requests to the extension in this process are made with; all of it outlives them.
struct LocalServices {
    FileProviderExtension& extension;
    SignalHub& signals;
    std::string rootPath;     // the storage root's, canonical
    std::string replicaPath;  // the replica's file
    std::string stateFolder;
    std::function<std::vector<Finding>()> findings;
};

// A host's requests to the extension in its own process. Where the extension answers no value, the
// request fails with the framework's error for an item that does not exist.
class LocalRequests final : public HostRequests {
  public:
    // Listings and watches must have ended before the services go.
    explicit LocalRequests(LocalServices services)
        : services_(std::move(services)),
          actions_(services_.extension, services_.rootPath, services_.stateFolder),
          replica_(*this, *this, services_.replicaPath) {}

    [[nodiscard]] Expected<FileProviderItemPtr> item(std::string_view identifier) override;
    [[nodiscard]] Expected<std::string> identifierAt(std::string_view path) override;
    [[nodiscard]] Expected<std::string> pathOf(std::string_view identifier) override;
    // A fresh enumerator over the container.
    [[nodiscard]] Expected<std::unique_ptr<ItemListing>> listing(
        std::string_view container) override;

    [[nodiscard]] Expected<std::optional<Data>> anchor(std::string_view container) override;
    [[nodiscard]] Expected<ItemChanges> changes(std::string_view container,
                                                const Data& since) override;
    [[nodiscard]] Expected<void> watch(const std::vector<std::string>& containers,
                                       const std::function<void()>& ready, const SignalTaker& taker,
                                       std::stop_token stop) override;
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> search(
        const std::vector<std::string>& words) override {
        return replica_.search(words);
    }
    [[nodiscard]] Expected<FileProviderItemPtr> perform(const ItemAction& action,
                                                        ActionObserver& observer,
                                                        const std::stop_token& stop) override {
        return actions_.perform(action, observer, stop);
    }
    [[nodiscard]] Expected<std::vector<Finding>> findings() override;

    [[nodiscard]] ReplicaKeeper& replica() { return replica_; }

    // Somebody who is told of signals, with the enumerators held for them; ends when it goes.
    class Watch;
    [[nodiscard]] Expected<std::unique_ptr<Watch>> startWatch(
        const std::vector<std::string>& containers, SignalTaker taker);

  private:
    [[nodiscard]] Expected<std::unique_ptr<FileProviderEnumerator>> enumeratorOf(
        std::string_view container);

    LocalServices services_;
    LocalActions actions_;
    ReplicaKeeper replica_;
};

class LocalRequests::Watch {
  public:
    Watch(std::vector<std::unique_ptr<FileProviderEnumerator>> enumerators,
          std::unique_ptr<SignalHub::Subscription> subscription)
        : enumerators_(std::move(enumerators)), subscription_(std::move(subscription)) {}
    Watch(const Watch&) = delete;
    Watch& operator=(const Watch&) = delete;
    ~Watch();

  private:
    std::vector<std::unique_ptr<FileProviderEnumerator>> enumerators_;
    std::unique_ptr<SignalHub::Subscription> subscription_;
};

}  // namespace marrowdale::host
