#include <dlfcn.h>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderExtension.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale {
namespace {

// The module as a host loads it. It stays loaded: sanitizers need the code of what they report.
ExtensionEntryPoint entryPoint() {
    const std::string path = programFolder() + "/../lib/marrowdale/marrowdale-provider.so";
    void* const module = ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    EXPECT_NE(module, nullptr) << ::dlerror();
    return module ? reinterpret_cast<ExtensionEntryPoint>(::dlsym(module, extensionEntryPointName))
                  : nullptr;
}

TEST(ExtensionModuleTest, makesAProviderThatAnswers) {
    FakePlatform fake;
    const ExtensionEntryPoint create = entryPoint();
    ASSERT_NE(create, nullptr);
    const std::unique_ptr<FileProviderExtension> provider(
        create(&fake.platform, extensionInterfaceVersion));
    ASSERT_NE(provider, nullptr);
    EXPECT_EQ(fake.manager.signalled().size(), 1U);
    EXPECT_FALSE(provider->itemForIdentifier("fid=1"));
}

TEST(ExtensionModuleTest, refusesAHostOfAnotherInterface) {
    FakePlatform fake;
    const ExtensionEntryPoint create = entryPoint();
    ASSERT_NE(create, nullptr);
    EXPECT_EQ(create(&fake.platform, extensionInterfaceVersion + 1), nullptr);
    EXPECT_EQ(create(nullptr, extensionInterfaceVersion), nullptr);
    EXPECT_TRUE(fake.manager.signalled().empty());
}

}  // namespace
}  // namespace marrowdale
