#pragma once

#include <functional>
#include <optional>
#include <string>

#include "platform/testing/ForwardingFileSystem.h"

namespace marrowdale {

// Answers instead of the real file system where a hook gives an answer, for what can't be provoked
// on a disk. A hook that is empty, or gives none, leaves the call to the real one. Hooks are set
// before the calls and not changed during them.
class FaultInjectingFileSystem : public ForwardingFileSystem {
  public:
    using ForwardingFileSystem::ForwardingFileSystem;

    std::function<std::optional<Error>(const URL&)> openFault;
    std::function<std::optional<Expected<CommonAttributes>>(const URL&)> commonAttributesAnswer;
    std::function<std::optional<Expected<FileStatus>>(const URL&)> statusAnswer;
    std::function<std::optional<Expected<ResourceValue>>(const URL&, ResourceKey)> resourceAnswer;
    std::function<std::optional<Error>(const URL&)> lookFault;
    std::function<std::optional<Expected<std::string>>(DeviceID, FileID)> pathAnswer;
    std::function<std::optional<Error>(const DirectoryEnumerationRequest&)> enumerateFault;
    std::function<std::optional<Error>(const URL&)> createFault;

    Expected<std::unique_ptr<OpenFile>> openForEvents(const URL& url) override;
    Expected<CommonAttributes> commonAttributes(const OpenFile& file) override;
    Expected<FileStatus> status(const URL& url) override;
    Expected<ResourceValue> resourceValue(const URL& url, ResourceKey key) override;
    // Brings nothing along where a value may be the hooks' to answer.
    std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                      const LookRequest& request) override;
    Expected<std::string> pathForFileID(DeviceID device, FileID file) override;
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& request) override;
    Expected<void> createDirectory(const URL& url) override;
};

}  // namespace marrowdale
