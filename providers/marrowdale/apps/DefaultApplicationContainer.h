#pragma once

#include <string_view>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

// The app library of one installed application, whether or not it qualifies to be listed. Fails
// with the host framework's invalid-parameter error when there is no such application, and when it
// has no documents folder that can be served.
[[nodiscard]] Expected<FileProviderItemPtr> defaultApplicationContainer(
    const Platform& platform, std::string_view bundleIdentifier);

}  // namespace marrowdale
