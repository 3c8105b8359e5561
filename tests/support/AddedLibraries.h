#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "platform/testing/FakeApplicationRegistry.h"

namespace marrowdale {

// Adds an application to the registry, and its library to those that the extension knows, without a
// refresh.
std::shared_ptr<FakeBundleRecord> addLibrary(const Platform& platform,
                                             FakeApplicationRegistry& applications,
                                             std::string identifier, std::string displayName,
                                             std::string_view containerPath);

}  // namespace marrowdale
