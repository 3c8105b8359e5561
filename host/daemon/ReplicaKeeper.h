#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/daemon/Replica.h"
#include "host/requests/HostRequests.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Keeps the replica complete by requests alone, as any client would: lists everything once, then
// follows what changed, and lists again where the anchor has expired. Any thread; one at a time
// works, the others wait.
class ReplicaKeeper {
  public:
    // `path`: the replica's file, which is made at first use.
    ReplicaKeeper(ItemRequests& items, FeedRequests& feed, std::string path)
        : items_(items), feed_(feed), path_(std::move(path)) {}

    // Catches up with everything that happened before the call.
    [[nodiscard]] Expected<void> catchUp();
    // Catches up, then answers what Replica::search does.
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> search(
        std::span<const std::string> words);
    // Catch up, then answer what the replica does.
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> collection(
        const ItemCollection& collection);
    [[nodiscard]] Expected<std::vector<TagCount>> tags();
    // The items of these domains are not found any more. Waits for nobody: whoever brings the
    // replica up to date may be waited for, and may be waiting for this. They are taken out before
    // anything else is found.
    void removeDomains(std::vector<std::string> domains);

  private:
    // Does the work on the replica; one that turns out to be damaged is made anew and the work
    // tried once more.
    template <typename Work>
    auto withReplica(const Work& work) -> decltype(work(std::declval<Replica&>()));
    // The same once it has caught up.
    template <typename Work>
    auto withNewest(const Work& work) -> decltype(work(std::declval<Replica&>()));
    [[nodiscard]] Expected<void> follow(Replica& replica);
    [[nodiscard]] Expected<void> removeLeavingDomains(Replica& replica);
    // False when the anchor has expired.
    [[nodiscard]] Expected<bool> followFrom(Replica& replica, Data anchor);
    [[nodiscard]] Expected<void> gather(Replica& replica);

    ItemRequests& items_;
    FeedRequests& feed_;
    const std::string path_;
    Mutex domainsMutex_;
    std::vector<std::string> leavingDomains_ MARROWDALE_GUARDED_BY(domainsMutex_);
    Mutex mutex_;
    std::optional<Replica> replica_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::host
