#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <set>
#include <string>

#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Which app libraries each version of their list had. An enumerator that was made after an
// application went, and before the list moved on, does not know that library any more and tells no
// deletion of it; a client that was told of it earlier may be answered by such a one. Any thread.
class ToldLibraries {
  public:
    // Versions that are remembered: the newest.
    static constexpr std::size_t most = 64;

    // Completes what an enumerator answered about changes since an anchor, and remembers the
    // libraries that it told.
    void complete(const Data& since, ItemChanges& changes);

  private:
    using Identifiers = std::set<std::string, std::less<>>;
    std::mutex mutex_;
    std::map<std::uint64_t, Identifiers> byVersion_;  // guarded by mutex_
};

}  // namespace marrowdale::host
