#pragma once

#include "platform/services/FileSystem.h"

namespace marrowdale {

// Hands every call on to another file system; derive and override what the test is about.
class ForwardingFileSystem : public FileSystem {
  public:
    explicit ForwardingFileSystem(FileSystem& target) : target_(target) {}

    Expected<std::unique_ptr<OpenFile>> openForEvents(const URL& url) override {
        return target_.openForEvents(url);
    }
    Expected<CommonAttributes> commonAttributes(const OpenFile& file) override {
        return target_.commonAttributes(file);
    }
    Expected<FileStatus> status(const URL& url) override { return target_.status(url); }
    Expected<ResourceValue> resourceValue(const URL& url, ResourceKey key) override {
        return target_.resourceValue(url, key);
    }
    std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                      const LookRequest& request) override {
        return target_.lookAt(urls, request);
    }
    Expected<std::string> pathForFileID(DeviceID device, FileID file) override {
        return target_.pathForFileID(device, file);
    }
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override {
        return target_.enumerateDirectory(request);
    }
    Expected<void> createDirectory(const URL& url) override { return target_.createDirectory(url); }

  private:
    FileSystem& target_;
};

}  // namespace marrowdale
