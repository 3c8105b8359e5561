#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <set>
#include <string>

#include "host/daemon/AppLibraries.h"
#include "host/daemon/KeptEnumerators.h"
#include "host/daemon/LibraryChanges.h"
#include "host/daemon/LocalActions.h"
#include "host/daemon/ReplicaKeeper.h"
#include "host/daemon/SignalHub.h"
#include "host/daemon/TrashWatch.h"
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
    // Called before somebody's refresh, for what was remembered of applications elsewhere; may be
    // null.
    std::function<void()> forgetApplications = nullptr;
    // Called once the extension knows which app libraries there are, and after every later refresh;
    // may be null.
    std::function<void()> librariesAreKnown = nullptr;
    // By which anchors of older versions of the app libraries are answered; may be null.
    const LibraryChanges* libraryChanges = nullptr;
    // Watches the trashes of all documents folders of now; may be null.
    std::function<std::unique_ptr<TrashWatch>()> watchTrashes = nullptr;
};

// A host's requests to the extension in its own process. Where the extension answers no value, the
// request fails with the framework's error for an item that does not exist. The first request waits
// until the applications of the system are known.
class LocalRequests final : public HostRequests {
  public:
    // Listings and watches must have ended before the services go.
    explicit LocalRequests(LocalServices services);

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
        libraries_.waitUntilKnown();
        return actions_.perform(action, observer, stop);
    }
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> appLibraries() override;
    [[nodiscard]] Expected<FileProviderItemPtr> applicationContainer(
        std::string_view bundleIdentifier) override;
    [[nodiscard]] Expected<void> refreshApplications() override;
    [[nodiscard]] Expected<std::vector<Thumbnail>> thumbnails(
        const std::vector<std::string>& identifiers) override;
    [[nodiscard]] Expected<std::vector<Finding>> findings() override;

    [[nodiscard]] std::optional<std::string> putBackParent(std::string_view item) {
        return actions_.putBackParent(item);
    }
    [[nodiscard]] ReplicaKeeper& replica() { return replica_; }
    // The applications of the system may have changed: has them looked at again, soon.
    void applicationsChanged() { libraries_.ask(); }

    // Somebody who is told of signals, with the enumerators held for them; ends when it goes.
    class Watch;
    [[nodiscard]] Expected<std::unique_ptr<Watch>> startWatch(
        const std::vector<std::string>& containers, SignalTaker taker);

  private:
    [[nodiscard]] Expected<std::unique_ptr<FileProviderEnumerator>> enumeratorOf(
        std::string_view container);
    // Keeps the enumerator for whoever comes back with that anchor; without one it has ended.
    void release(std::string_view container, const std::optional<Data>& anchor,
                 std::unique_ptr<FileProviderEnumerator> enumerator);
    // Asks the enumerator, and keeps it for whoever comes back with the anchor of its answer.
    [[nodiscard]] Expected<ItemChanges> ask(std::string_view container, const Data& since,
                                            std::unique_ptr<FileProviderEnumerator> enumerator);
    // What is answered instead: no value where the answer holds.
    [[nodiscard]] std::optional<Expected<ItemChanges>> bridged(std::string_view container,
                                                               const Data& since,
                                                               const Expected<ItemChanges>& answer);
    void renewWatches();

    LocalServices services_;
    LocalActions actions_;
    ReplicaKeeper replica_;
    KeptEnumerators kept_;
    std::mutex watching_;
    std::set<Watch*> watches_;  // guarded by watching_
    std::atomic<std::uint64_t> renewals_ = 0;
    AppLibraries libraries_;  // renews watches; goes first
};

class LocalRequests::Watch {
  public:
    using Enumerators = std::vector<std::unique_ptr<FileProviderEnumerator>>;
    // One enumerator for each container; they are started.
    Watch(LocalRequests& requests, std::vector<std::string> containers, Enumerators enumerators,
          std::unique_ptr<SignalHub::Subscription> subscription);
    Watch(const Watch&) = delete;
    Watch& operator=(const Watch&) = delete;
    ~Watch();

  private:
    friend class LocalRequests;
    // The libraries are others than before: holds enumerators that watch those of now. Called with
    // the requests' lock.
    void renew();
    void watchTrashes();

    LocalRequests& requests_;
    const std::vector<std::string> containers_;
    Enumerators enumerators_;              // guarded by the requests' lock
    std::unique_ptr<TrashWatch> trashes_;  // the same; null where the working set is not watched
    std::unique_ptr<SignalHub::Subscription> subscription_;
};

}  // namespace marrowdale::host
