#include "host/daemon/ReplicaKeeper.h"

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <iterator>
#include <system_error>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

constexpr std::int64_t mostResults = 10'000;
constexpr int mostGatherings = 5;
constexpr std::string_view container = VantrelWorkingSetContainerItemIdentifier;

bool isDamage(const Error& error) {
    return error.domain == ErrorDomain::posix && error.code == EUCLEAN;
}

}  // namespace

template <typename Work>
auto ReplicaKeeper::withReplica(const Work& work) -> decltype(work(std::declval<Replica&>())) {
    const MutexLock lock(mutex_);
    for (bool isSecondTry = false;; isSecondTry = true) {
        if (!replica_) {
            auto opened = Replica::open(path_);
            if (!opened) {
                return Unexpected(opened.error());
            }
            replica_.emplace(std::move(*opened));
        }
        auto result = work(*replica_);
        if (result || isSecondTry || !isDamage(result.error())) {
            return result;
        }
        replica_.reset();
        std::error_code ignored;
        std::filesystem::remove(path_, ignored);
    }
}

template <typename Work>
auto ReplicaKeeper::withNewest(const Work& work) -> decltype(work(std::declval<Replica&>())) {
    using Result = decltype(work(std::declval<Replica&>()));
    return withReplica([&](Replica& replica) -> Result {
        if (auto followed = follow(replica); !followed) {
            return Unexpected(followed.error());
        }
        return work(replica);
    });
}

Expected<void> ReplicaKeeper::catchUp() {
    return withReplica([this](Replica& replica) { return follow(replica); });
}

Expected<std::vector<FileProviderItemPtr>> ReplicaKeeper::search(
    std::span<const std::string> words) {
    return withNewest([&](Replica& replica) { return replica.search(words, mostResults); });
}

Expected<std::vector<FileProviderItemPtr>> ReplicaKeeper::collection(
    const ItemCollection& collection) {
    return withNewest(
        [&](Replica& replica) { return replica.collection(collection, mostResults); });
}

Expected<std::vector<TagCount>> ReplicaKeeper::tags() {
    return withNewest([](Replica& replica) { return replica.tags(); });
}

void ReplicaKeeper::removeDomains(std::vector<std::string> domains) {
    const MutexLock lock(domainsMutex_);
    std::ranges::move(domains, std::back_inserter(leavingDomains_));
}

Expected<void> ReplicaKeeper::removeLeavingDomains(Replica& replica) {
    std::vector<std::string> domains;
    {
        const MutexLock lock(domainsMutex_);
        std::swap(domains, leavingDomains_);
    }
    if (domains.empty()) {
        return {};
    }
    auto removed = replica.removeDomains(domains);
    if (!removed) {
        removeDomains(std::move(domains));
    }
    return removed;
}

Expected<void> ReplicaKeeper::follow(Replica& replica) {
    for (int i = 0; i < mostGatherings; ++i) {
        auto anchor = replica.anchor();
        if (!anchor) {
            return Unexpected(anchor.error());
        }
        if (*anchor) {
            const auto followed = followFrom(replica, std::move(**anchor));
            if (!followed || *followed) {
                return followed ? Expected<void>() : Unexpected(followed.error());
            }
        }
        // A listing that expires on the way is begun again as well.
        if (auto gathered = gather(replica);
            !gathered && gathered.error() != errorSyncAnchorExpired()) {
            return gathered;
        }
    }
    return Unexpected(errorSyncAnchorExpired());
}

Expected<bool> ReplicaKeeper::followFrom(Replica& replica, Data anchor) {
    MoreComing moreComing = MoreComing::yes;
    while (moreComing == MoreComing::yes) {
        const auto changes = feed_.changes(container, anchor);
        if (!changes) {
            return changes.error() == errorSyncAnchorExpired() ? Expected<bool>(false)
                                                               : Unexpected(changes.error());
        }
        // Before the answer: what came back since is in it.
        if (auto removed = removeLeavingDomains(replica); !removed) {
            return Unexpected(removed.error());
        }
        // An answer that brings nothing is not worth a write.
        if (changes->anchor != anchor || !changes->updated.empty() || !changes->deleted.empty()) {
            if (auto applied = replica.apply(*changes); !applied) {
                return Unexpected(applied.error());
            }
        }
        anchor = changes->anchor;
        moreComing = changes->moreComing;
    }
    return true;
}

Expected<void> ReplicaKeeper::gather(Replica& replica) {
    // The anchor comes first: what happens while the folders are listed is followed from there.
    const auto anchor = feed_.anchor(container);
    if (!anchor) {
        return Unexpected(anchor.error());
    }
    if (!*anchor) {
        return Unexpected(errorWithPOSIXCode(ENOTSUP, "follow the changes of", container));
    }
    if (auto cleared = replica.clear(); !cleared) {
        return cleared;
    }
    const auto listing = items_.listing(VantrelAllDirectoriesContainerItemIdentifier);
    if (!listing) {
        return Unexpected(listing.error());
    }
    std::optional<Data> next = VantrelInitialPageSortedByName();
    while (next) {
        auto page = (*listing)->page(*next);
        if (!page) {
            return Unexpected(page.error());
        }
        if (auto added = replica.add(page->items); !added) {
            return added;
        }
        next = std::move(page->nextPage);
    }
    return replica.setAnchor(**anchor);
}

}  // namespace marrowdale::host
