#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/ResourceValue.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// The record of one item as a provider hands it to its host: a snapshot, not changed after it was
// handed over. Field names are those of machine output.
class FileProviderItem {
  public:
    explicit FileProviderItem(URL url) : fileURL(std::move(url)) {}
    virtual ~FileProviderItem() = default;

    std::string itemIdentifier;
    std::string parentItemIdentifier;           // the root's parent is the root itself
    std::string filename;                       // bytes as the system has them
    std::string typeIdentifier;                 // MIME type
    std::optional<std::uint64_t> documentSize;  // bytes
    std::optional<Date> creationDate;
    std::optional<Date> contentModificationDate;
    std::optional<std::uint64_t> childItemCount;
    std::uint64_t capabilities = 0;  // ItemCapability bits
    // Changes when the content does: 12 bytes, big-endian seconds (64 bits) and nanoseconds (32) of
    // the content modification date.
    std::optional<Data> versionIdentifier;
    bool isTrashed = false;
    std::optional<Date> lastUsedDate;
    // A binary property list: an array of dictionaries with "label" (string) and "color" (integer).
    std::optional<Data> tagData;
    std::optional<Number> favoriteRank;
    std::optional<std::uint64_t> fileID;
    std::optional<std::uint64_t> docID;
    URL fileURL;
    std::optional<std::string> hx_lumenoDomainIdentifier;
    std::optional<std::string> hx_appContainerBundleIdentifier;
    bool hx_isUbiquitous = false;

    // True for an app library.
    [[nodiscard]] virtual bool hx_isContainer() const = 0;
    // The type conforms to the folder type.
    [[nodiscard]] virtual bool isFolder() const = 0;
    // One line for logs.
    [[nodiscard]] virtual std::string description() const = 0;
};

}  // namespace marrowdale
