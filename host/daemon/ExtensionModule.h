#pragma once

#include <memory>
#include <string>

#include "host/daemon/StartFailure.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// An extension's module, loaded. Under sanitizers it stays loaded to the end of the process, so
// that their reports can name its functions. One thread.
class ExtensionModule {
  public:
    // Loads the module at that path; fails when it can't be loaded or lacks the entry point.
    [[nodiscard]] static Started<std::unique_ptr<ExtensionModule>> load(const std::string& path);
    // Where this program's own module lies: ../lib/marrowdale/marrowdale-provider.so, seen from the
    // program's folder, in a build as when installed.
    [[nodiscard]] static std::string standardPath();

    ~ExtensionModule();
    ExtensionModule(const ExtensionModule&) = delete;
    ExtensionModule& operator=(const ExtensionModule&) = delete;

    // Makes the extension. It must go before the module and the platform do. Fails when the module
    // was built for another version of the interface.
    [[nodiscard]] Started<std::unique_ptr<FileProviderExtension>> makeExtension(
        const Platform& platform) const;

  private:
    ExtensionModule(std::string path, void* handle, ExtensionEntryPoint entryPoint)
        : path_(std::move(path)), handle_(handle), entryPoint_(entryPoint) {}

    std::string path_;
    void* handle_;
    ExtensionEntryPoint entryPoint_;
};

}  // namespace marrowdale::host
