#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"

namespace marrowdale {

enum class LocalAppLibraryCacheSource : std::uint8_t {
    main,        // the applications that qualify, as the last refresh found them
    workingSet,  // those that the working set's listener was told of
};

// "main cache" or "working-set cache".
[[nodiscard]] std::string_view description(LocalAppLibraryCacheSource source);

using BundleRecords = std::vector<std::shared_ptr<const BundleRecord>>;

// A list of bundle records and its version, kept on disk. One for each source in a world.
//
// Whatever is wrong with the file, it reads as an empty list of version 0, so that the next refresh
// sees a change; nothing is deleted, the next save replaces it. The file is a keyed archive: a
// dictionary of "versionToken" (number) and "bundleProxy" (array of bundle records, in order).
class LocalAppLibraryCache {
  public:
    // Ends the process where the user has no folder for what programs keep.
    LocalAppLibraryCache(const Platform& platform, LocalAppLibraryCacheSource source);
    [[nodiscard]] static LocalAppLibraryCache& of(const Platform& platform,
                                                  LocalAppLibraryCacheSource source);

    // "marrowdale.app-library-cache.main" or "….working-set". Everything below but the last three
    // runs on it, and ends the process elsewhere.
    [[nodiscard]] const SerialQueue& queue() const { return queue_; }

    // The list on disk; its version is `versionToken` afterwards.
    [[nodiscard]] BundleRecords load();
    enum class Bump : bool { no, yes };
    // Writes the list, under the version given, or, with `yes`, under the one after the current.
    // Answers the version written, which is then the current one; a failure changes nothing.
    [[nodiscard]] Expected<std::uint64_t> save(const BundleRecords& records,
                                               std::uint64_t versionToken, Bump bump);
    // Of the list that was last loaded or saved; 0 before that.
    [[nodiscard]] std::uint64_t versionToken() const;

    [[nodiscard]] const URL& cacheURL() const { return cacheURL_; }
    // The path for log lines: "~/" and its last four components.
    [[nodiscard]] std::string shortPath() const;
    [[nodiscard]] std::string_view description() const { return marrowdale::description(source_); }

  private:
    void assertOnQueue() const;
    [[nodiscard]] BundleRecords reset();
    [[nodiscard]] BundleRecords recordsInData(const Data& data);

    const Platform& platform_;
    const LocalAppLibraryCacheSource source_;
    const SerialQueue queue_;
    const URL cacheURL_;
    std::uint64_t versionToken_ = 0;  // on queue_
};

}  // namespace marrowdale
