#include "platform/testing/FaultInjectingFileSystem.h"

#include <utility>

namespace marrowdale {

namespace {

// What the hook answers; nothing without a hook.
template <typename Hook, typename... Arguments>
auto ask(const Hook& hook, const Arguments&... arguments) {
    return hook ? hook(arguments...) : decltype(hook(arguments...))();
}

}  // namespace

Expected<std::unique_ptr<OpenFile>> FaultInjectingFileSystem::openForEvents(const URL& url) {
    if (const auto fault = ask(openFault, url)) {
        return Unexpected(*fault);
    }
    return ForwardingFileSystem::openForEvents(url);
}

Expected<CommonAttributes> FaultInjectingFileSystem::commonAttributes(const OpenFile& file) {
    auto answer = ask(commonAttributesAnswer, file.url());
    return answer ? std::move(*answer) : ForwardingFileSystem::commonAttributes(file);
}

Expected<FileStatus> FaultInjectingFileSystem::status(const URL& url) {
    auto answer = ask(statusAnswer, url);
    return answer ? std::move(*answer) : ForwardingFileSystem::status(url);
}

Expected<ResourceValue> FaultInjectingFileSystem::resourceValue(const URL& url, ResourceKey key) {
    auto answer = ask(resourceAnswer, url, key);
    return answer ? std::move(*answer) : ForwardingFileSystem::resourceValue(url, key);
}

std::vector<Expected<URL>> FaultInjectingFileSystem::lookAt(std::span<const URL> urls,
                                                            const LookRequest& request) {
    if (resourceAnswer || statusAnswer) {
        return {urls.begin(), urls.end()};
    }
    auto answers = ForwardingFileSystem::lookAt(urls, request);
    for (std::size_t i = 0; i < urls.size(); ++i) {
        if (const auto fault = ask(lookFault, urls[i])) {
            answers[i] = Unexpected(*fault);
        }
    }
    return answers;
}

Expected<std::string> FaultInjectingFileSystem::pathForFileID(DeviceID device, FileID file) {
    auto answer = ask(pathAnswer, device, file);
    return answer ? std::move(*answer) : ForwardingFileSystem::pathForFileID(device, file);
}

Expected<std::unique_ptr<DirectoryEnumerator>> FaultInjectingFileSystem::enumerateDirectory(
    const DirectoryEnumerationRequest& request) {
    if (const auto fault = ask(enumerateFault, request)) {
        return Unexpected(*fault);
    }
    return ForwardingFileSystem::enumerateDirectory(request);
}

Expected<void> FaultInjectingFileSystem::createDirectory(const URL& url) {
    if (const auto fault = ask(createFault, url)) {
        return Unexpected(*fault);
    }
    return ForwardingFileSystem::createDirectory(url);
}

}  // namespace marrowdale
