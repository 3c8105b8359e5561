// The module's one exported symbol; see FileProviderExtension.h for its contract.

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderExtension.h"
#include "providers/marrowdale/LocalFileProvider.h"

extern "C" __attribute__((visibility("default"))) marrowdale::FileProviderExtension*
MarrowdaleCreateExtension(const marrowdale::Platform* platform,
                          std::uint32_t interfaceVersion) noexcept {
    if (!platform || interfaceVersion != marrowdale::extensionInterfaceVersion) {
        return nullptr;
    }
    try {
        return new marrowdale::LocalFileProvider(*platform);
    } catch (...) {
        return nullptr;  // no room; an exception must not cross the C interface
    }
}
