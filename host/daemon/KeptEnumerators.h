#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::host {

// Enumerators of the root, the working set and all directories that wait for their clients to come
// back. Such an enumerator goes on only from an anchor of the version of the app libraries that it
// knows itself, and the next request brings it up to the newest; so a client whose anchor is of an
// older version is answered by one that was kept since then, or, at a higher price, with the help
// of LibraryChanges. A few are kept for each version,
// as several clients may hold anchors of it; those that waited longest are let go first.
//
// Any thread. Whoever takes one out has it for himself.
class KeptEnumerators {
  public:
    static constexpr std::size_t most = 24;
    static constexpr std::size_t mostOfOneVersion = 4;

    KeptEnumerators() = default;
    // Invalidates all.
    ~KeptEnumerators();
    KeptEnumerators(const KeptEnumerators&) = delete;
    KeptEnumerators& operator=(const KeptEnumerators&) = delete;

    // One that goes on from that anchor; null where none is kept.
    [[nodiscard]] std::unique_ptr<FileProviderEnumerator> take(std::string_view container,
                                                               const Data& anchor);
    // Keeps one that answered with that anchor, or lets it go: one that nobody can come back to is
    // invalidated, and so is one too many.
    void keep(std::string_view container, const Data& anchor,
              std::unique_ptr<FileProviderEnumerator> enumerator);

  private:
    struct Kept {
        std::string container;
        std::uint64_t version = 0;
        std::unique_ptr<FileProviderEnumerator> enumerator;
    };
    [[nodiscard]] std::size_t count(std::string_view container, std::uint64_t version) const;

    std::mutex mutex_;
    std::deque<Kept> kept_;  // guarded by mutex_; oldest first
};

}  // namespace marrowdale::host
