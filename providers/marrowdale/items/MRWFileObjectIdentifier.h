#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/Platform.h"

namespace marrowdale {

// The strings by which items are named towards the host, and which stay the same while a file is
// renamed or moved. There are five kinds: the root's and the temporary folder's constants, "fid="
// and an inode number for plain folders, "did=" and a document identifier for files and packages,
// "#" and a bundle identifier for app libraries. None carries a volume: all items live on that of
// the storage root.
class MRWFileObjectIdentifier {
  public:
    MRWFileObjectIdentifier() = delete;

    [[nodiscard]] static std::string fromFileID(std::uint64_t fileID);
    [[nodiscard]] static std::string fromDocumentID(std::uint64_t documentID);
    // None, after a line in the log, when no application owns the folder.
    [[nodiscard]] static std::optional<std::string> fromAppLibraryDataContainerURL(
        const Platform& platform, const URL& url);
};

// "#" and the record's bundle identifier, or "#(null)": a record without one is named so on purpose
// and never refused for it.
[[nodiscard]] std::string appLibraryIdentifier(const BundleRecord& record);

}  // namespace marrowdale
