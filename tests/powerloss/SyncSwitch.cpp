#include "tests/powerloss/SyncSwitch.h"

#include <atomic>
#include <sys/syscall.h>
#include <unistd.h>

namespace {

using marrowdale::tests::Syncs;

// NOLINTNEXTLINE(cppcoreguidelines-avoid-non-const-global-variables): for the two functions below
std::atomic<Syncs> mode = Syncs::kept;

int syncOrNot(long call, int file) {
    return mode.load() == Syncs::ignored ? 0 : static_cast<int>(::syscall(call, file));
}

}  // namespace

extern "C" int fdatasync(int fildes) {
    return syncOrNot(SYS_fdatasync, fildes);
}
extern "C" int fsync(int fd) {
    return syncOrNot(SYS_fsync, fd);
}

namespace marrowdale::tests {

void setSyncs(Syncs syncs) {
    mode = syncs;
}

}  // namespace marrowdale::tests
