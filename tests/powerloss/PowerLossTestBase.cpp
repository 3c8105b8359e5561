#include "tests/powerloss/PowerLossTestBase.h"

#include <cerrno>
#include <sched.h>
#include <sstream>
#include <sys/mount.h>
#include <system_error>
#include <unistd.h>

#include "platform/testing/TestFiles.h"

namespace marrowdale::tests {

namespace {

std::string problemWithMounts() {
    if (::unshare(CLONE_NEWNS) != 0 ||
        ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
        return "a mount namespace of its own: " + std::generic_category().message(errno);
    }
    for (const char* device : {"/dev/fuse", "/dev/loop-control"}) {
        if (::access(device, R_OK | W_OK) != 0) {
            return std::string(device) + ": " + std::generic_category().message(errno);
        }
    }
    return "";
}

}  // namespace

std::string whyNoPowerLoss() {
    static const std::string problem = problemWithMounts();
    return problem;
}

bool kernelKnows(const DiskFormat& format) {
    // The kernel loads a missing module when it is asked to mount; without a device that is all.
    (void)::mount("none", "/", format.name.c_str(), 0, nullptr);
    return errno != ENODEV;
}

void PowerLossTestBase::SetUp() {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount a disk whose writes are logged");
    }
    if (const std::string problem = whyNoPowerLoss(); !problem.empty()) {
        MARROWDALE_SKIP(problem);
    }
    makeFolder(imageFolder());
    makeFolder(diskFolder());
}

std::optional<LoopMount> PowerLossTestBase::mount(const std::string& image,
                                                  const DiskFormat& format) const {
    auto mounted = LoopMount::mount(image, diskFolder(), format);
    if (!mounted) {
        ADD_FAILURE() << mounted.error().description();
        return std::nullopt;
    }
    return std::optional<LoopMount>(std::move(*mounted));
}

}  // namespace marrowdale::tests
