#pragma once

#include <cerrno>
#include <utility>

#include "platform/services/FileSystem.h"

namespace marrowdale {

// An open file without a descriptor.
class FakeOpenFile : public OpenFile {
  public:
    explicit FakeOpenFile(URL url) : url_(std::move(url)) {}
    [[nodiscard]] int descriptor() const override { return -1; }
    [[nodiscard]] const URL& url() const override { return url_; }

  private:
    URL url_;
};

// A file system without a disk, where everything can be opened and nothing can be found: what a
// test or fuzzer needs that must not touch the real one. Below FaultInjectingFileSystem, it answers
// what the hooks leave out.
class EmptyFileSystem : public FileSystem {
  public:
    // The volume that everything is said to lie on.
    static constexpr DeviceID device{42};

    Expected<std::unique_ptr<OpenFile>> openForEvents(const URL& url) override {
        return std::make_unique<FakeOpenFile>(url);
    }
    Expected<CommonAttributes> commonAttributes(const OpenFile& /*file*/) override {
        return CommonAttributes{
            .device = device, .type = FileType::other, .documentID = {}, .fileID = {}};
    }
    Expected<FileStatus> status(const URL& url) override { return noSuchFile(url); }
    Expected<ResourceValue> resourceValue(const URL& url, ResourceKey key) override {
        if (const auto cached = url.cachedResourceValue(key)) {
            return *cached;
        }
        return Unexpected(Error{ErrorDomain::file, static_cast<int>(FileErrorCode::noSuchFile),
                                "read a resource of", url.path()});
    }
    // Brings nothing along, so that what is asked of an item decides.
    std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                      const LookRequest& /*request*/) override {
        return {urls.begin(), urls.end()};
    }
    Expected<std::string> pathForFileID(DeviceID /*device*/, FileID /*file*/) override {
        return Unexpected(errorWithPOSIXCode(ENOENT));
    }
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override {
        return noSuchFile(request.url);
    }
    Expected<void> createDirectory(const URL& url) override { return noSuchFile(url); }

  private:
    static Unexpected noSuchFile(const URL& url) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "find", url.path()));
    }
};

}  // namespace marrowdale
