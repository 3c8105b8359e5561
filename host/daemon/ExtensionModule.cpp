#include "host/daemon/ExtensionModule.h"

#include <bit>
#include <dlfcn.h>
#include <filesystem>
#include <system_error>

#include "host/requests/HarmlessText.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define MARROWDALE_KEEPS_MODULES 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define MARROWDALE_KEEPS_MODULES 1
#endif
#endif
#ifndef MARROWDALE_KEEPS_MODULES
#define MARROWDALE_KEEPS_MODULES 0
#endif

namespace marrowdale::host {

namespace {

StartFailure loadFailure(const std::string& path, std::string_view why) {
    return StartFailure::refusal("can't load the extension \"" + harmlessLine(path) +
                                 "\": " + harmlessLine(why));
}

std::string_view lastLoaderError() {
    const char* const text = ::dlerror();
    return text != nullptr ? text : "unknown reason";
}

}  // namespace

std::string ExtensionModule::standardPath() {
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    return (program.parent_path().parent_path() / "lib/marrowdale/marrowdale-provider.so").string();
}

Started<std::unique_ptr<ExtensionModule>> ExtensionModule::load(const std::string& path) {
    void* const handle = ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr) {
        return std::unexpected(loadFailure(path, lastLoaderError()));
    }
    void* const symbol = ::dlsym(handle, extensionEntryPointName);
    if (symbol == nullptr) {
        StartFailure failure = loadFailure(path, lastLoaderError());
        ::dlclose(handle);
        return std::unexpected(std::move(failure));
    }
    return std::unique_ptr<ExtensionModule>(
        new ExtensionModule(path, handle, std::bit_cast<ExtensionEntryPoint>(symbol)));
}

ExtensionModule::~ExtensionModule() {
    if (!MARROWDALE_KEEPS_MODULES) {
        ::dlclose(handle_);
    }
}

Started<std::unique_ptr<FileProviderExtension>> ExtensionModule::makeExtension(
    const Platform& platform) const {
    std::unique_ptr<FileProviderExtension> extension(
        entryPoint_(&platform, extensionInterfaceVersion));
    if (!extension) {
        return std::unexpected(loadFailure(
            path_, "it was built for another version of the interface; install both together"));
    }
    return extension;
}

}  // namespace marrowdale::host
