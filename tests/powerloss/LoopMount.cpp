#include "tests/powerloss/LoopMount.h"

#include <cerrno>
#include <fcntl.h>
#include <linux/btrfs.h>
#include <linux/loop.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <utility>

#include <gtest/gtest.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::tests {

namespace {

using native::UniqueFD;

struct LoopDevice {
    UniqueFD descriptor;
    std::string path;
};

Unexpected failure(const char* operation, const std::string& subject) {
    return Unexpected(errorWithPOSIXCode(errno, operation, subject));
}

// Direct I/O is left off; a flush of the device becomes an fsync of the image either way.
Expected<LoopDevice> attach(const std::string& image) {
    const UniqueFD file(::open(image.c_str(), O_RDWR | O_CLOEXEC));
    if (!file) {
        return failure("open", image);
    }
    const UniqueFD control(::open("/dev/loop-control", O_RDWR | O_CLOEXEC));
    if (!control) {
        return failure("open", "/dev/loop-control");
    }
    while (true) {
        const int number = ::ioctl(control.get(), LOOP_CTL_GET_FREE);
        if (number < 0) {
            return failure("find a loop device for", image);
        }
        LoopDevice loop{UniqueFD(), "/dev/loop" + std::to_string(number)};
        loop.descriptor.reset(::open(loop.path.c_str(), O_RDWR | O_CLOEXEC));
        if (!loop.descriptor) {
            return failure("open", loop.path);
        }
        loop_config config{};
        config.fd = static_cast<std::uint32_t>(file.get());
        config.info.lo_flags = LO_FLAGS_AUTOCLEAR;
        if (::ioctl(loop.descriptor.get(), LOOP_CONFIGURE, &config) == 0) {
            return loop;
        }
        if (errno != EBUSY) {  // somebody else was quicker
            return failure("set up", loop.path);
        }
    }
}

// btrfs remembers disks after they are unmounted, and refuses an older state of the same disk.
void forgetDisk(const std::string& device) {
    const UniqueFD control(::open("/dev/btrfs-control", O_RDWR | O_CLOEXEC));
    if (!control) {
        return;
    }
    btrfs_ioctl_vol_args named{};
    device.copy(named.name, sizeof named.name - 1);
    (void)::ioctl(control.get(), BTRFS_IOC_FORGET_DEV, &named);
}

}  // namespace

Expected<LoopMount> LoopMount::mount(const std::string& image, const std::string& folder,
                                     const DiskFormat& format) {
    const auto loop = attach(image);
    if (!loop) {
        return Unexpected(loop.error());
    }
    if (::mount(loop->path.c_str(), folder.c_str(), format.name.c_str(), 0,
                format.options.c_str()) != 0) {
        return failure("mount", format.name);
    }
    return LoopMount(folder, loop->path);
}

LoopMount::LoopMount(LoopMount&& other) noexcept
    : folder_(std::exchange(other.folder_, {})), device_(std::move(other.device_)) {}

LoopMount::~LoopMount() {
    if (folder_.empty()) {
        return;
    }
    // Held open, so that nobody else gets the device before it is forgotten.
    const UniqueFD device(::open(device_.c_str(), O_RDONLY | O_CLOEXEC));
    if (::umount2(folder_.c_str(), UMOUNT_NOFOLLOW) != 0) {
        ADD_FAILURE() << folder_ << " is still in use";
        ::umount2(folder_.c_str(), UMOUNT_NOFOLLOW | MNT_DETACH);
    }
    forgetDisk(device_);
}

}  // namespace marrowdale::tests
