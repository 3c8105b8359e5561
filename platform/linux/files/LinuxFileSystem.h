#pragma once

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
    [[nodiscard]] std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                                    const LookRequest& request) override;
    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file) override;
    [[nodiscard]] Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override;
    [[nodiscard]] Expected<void> createDirectory(const URL& url) override;

  private:
    [[nodiscard]] Expected<ResourceValue> lookUp(const URL& url, ResourceKey key);
    [[nodiscard]] Expected<void> cacheDocumentIdentifier(const URL& url, const Place& place,
                                                         const EntryStatus& status);
    void cacheAccess(const URL& url, const Place& place, const EntryStatus& status);

    FileSources sources_;
    AttributeReader accessLists_{{}};
};

}  // namespace marrowdale::native
