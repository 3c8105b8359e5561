#pragma once

#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// Small files of a program's own, outside of what it serves. Any thread; writers of one file take
// turns by themselves.
class ApplicationSupport {
  public:
    virtual ~ApplicationSupport() = default;

    // The folders of the user for what programs keep, the one to use first. Empty where the user
    // has none; a folder named here may be missing yet.
    [[nodiscard]] virtual std::vector<URL> applicationSupportDirectories() = 0;

    // Makes the folder and those above it that are missing.
    [[nodiscard]] virtual Expected<void> createDirectory(const URL& url) = 0;

    // The whole contents of a regular file. A file that is not there is the file domain's error
    // 260; one that is no regular file, or is larger than a small file may be, is EINVAL or EFBIG;
    // everything else comes as the system says it.
    [[nodiscard]] virtual Expected<Data> read(const URL& url) = 0;

    // Makes `contents` what the file holds, atomically and durably: whoever reads it, also after a
    // kill or a loss of power at any moment, finds the old contents or the new ones, and the new
    // ones once the call has returned. Nothing is left behind by a call that fails.
    [[nodiscard]] virtual Expected<void> replace(const URL& url, const Data& contents) = 0;
};

}  // namespace marrowdale
