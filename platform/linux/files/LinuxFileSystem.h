#pragma once

#include <memory>
#include <mutex>
#include <span>
#include <string>
#include <vector>

#include "platform/linux/files/AttributeReader.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/FileSources.h"
#include "platform/linux/files/Place.h"
#include "platform/services/FileSystem.h"

namespace marrowdale::native {

// The file system through Linux's calls. Must outlive the walks made with it; type identifiers that
// its URLs carry live as long as the MimeTypes it was given.
class LinuxFileSystem final : public FileSystem {
  public:
    explicit LinuxFileSystem(FileSources sources) : sources_(std::move(sources)) {}

    [[nodiscard]] Expected<std::unique_ptr<OpenFile>> openForEvents(const URL& url) override;
    [[nodiscard]] Expected<CommonAttributes> commonAttributes(const OpenFile& file) override;
    [[nodiscard]] Expected<FileStatus> status(const URL& url) override;
    [[nodiscard]] Expected<ResourceValue> resourceValue(const URL& url, ResourceKey key) override;
    [[nodiscard]] URL lookedAt(const URL& url, const ResourceKeySet& keys,
                               std::span<const std::string> attributeNames) override;
    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file) override;
    [[nodiscard]] Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override;
    [[nodiscard]] Expected<void> createDirectory(const URL& url) override;

  private:
    [[nodiscard]] Expected<ResourceValue> lookUp(const URL& url, ResourceKey key);
    [[nodiscard]] Expected<void> cacheDocumentIdentifier(const URL& url, const Place& place,
                                                         const EntryStatus& status);
    void cacheAccess(const URL& url, const Place& place, const EntryStatus& status);
    [[nodiscard]] Access accessTo(const Place& place, const EntryStatus& status,
                                  bool hasAccessList) const;
    [[nodiscard]] std::shared_ptr<const AttributeReader> readerOf(
        std::span<const std::string> attributeNames);
    [[nodiscard]] FoundAttributes attributesOf(const Place& place, const EntryStatus& status,
                                               const AttributeReader& reader, Date now);

    FileSources sources_;
    AttributeReader accessLists_{{}};
    // Everybody asks for the same names.
    std::mutex mutex_;
    std::vector<std::string> names_;                 // guarded by mutex_
    std::shared_ptr<const AttributeReader> reader_;  // of these names; guarded by mutex_
};

}  // namespace marrowdale::native
