#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/hostframework/FileProviderActions.h"
#include "platform/hostframework/FileProviderApplications.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

struct Platform;

// What a provider answers its host. Any thread, several at once. No exception leaves a call.
class FileProviderExtension : public FileProviderItemActions,
                              public FileProviderMetadataActions,
                              public FileProviderApplications {
  public:
    // No value when nothing of that identifier exists; never fails.
    [[nodiscard]] virtual std::optional<URL> URLForItemWithPersistentIdentifier(
        std::string_view itemIdentifier) = 0;
    [[nodiscard]] virtual std::optional<std::string> persistentIdentifierForItemAtURL(
        const URL& url) = 0;
    [[nodiscard]] virtual Expected<FileProviderItemPtr> itemForIdentifier(
        std::string_view itemIdentifier) = 0;
    [[nodiscard]] virtual Expected<std::unique_ptr<FileProviderEnumerator>>
    enumeratorForContainerItemIdentifier(std::string_view containerItemIdentifier) = 0;

    using CompletionHandler = std::function<void(const std::optional<Error>&)>;
    virtual void providePlaceholderAtURL(const URL& url, CompletionHandler completionHandler) = 0;
    virtual void startProvidingItemAtURL(const URL& url, CompletionHandler completionHandler) = 0;
    virtual void stopProvidingItemAtURL(const URL& url) = 0;
    virtual void itemChangedAtURL(const URL& url) = 0;
};

// The one symbol that an extension module exports, with C linkage. `interfaceVersion` is the
// host's; an extension that was built for another one answers null. The caller owns the result, and
// keeps the platform and the module alive for longer.
inline constexpr std::uint32_t extensionInterfaceVersion = 1;
inline constexpr const char* extensionEntryPointName = "MarrowdaleCreateExtension";
using ExtensionEntryPoint = FileProviderExtension* (*)(const Platform* platform,
                                                       std::uint32_t interfaceVersion);

}  // namespace marrowdale
