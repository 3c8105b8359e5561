#include "platform/linux/files/Access.h"

#include <algorithm>
#include <array>
#include <fcntl.h>
#include <linux/capability.h>
#include <sys/statfs.h>
#include <sys/statvfs.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace marrowdale::native {

namespace {

constexpr std::uint32_t readBit = 4;
constexpr std::uint32_t writeBit = 2;
// What a user or group outside this process's user namespace is shown as; privilege inside the
// namespace does not reach such files.
constexpr std::uint32_t foreignID = 65534;

std::uint64_t effectiveCapabilities() {
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    std::array<__user_cap_data_struct, _LINUX_CAPABILITY_U32S_3> data{};
    if (::syscall(SYS_capget, &header, data.data()) != 0) {
        return 0;
    }
    return data[0].effective | (std::uint64_t{data[1].effective} << 32U);
}

bool has(std::uint64_t capabilities, unsigned capability) {
    return ((capabilities >> capability) & 1U) != 0;
}

bool looksForeign(const EntryStatus& status) {
    return status.owner == foreignID || status.group == foreignID;
}

std::uint32_t permissionBits(const EntryStatus& status, const Credentials& credentials) {
    if (status.owner == credentials.user) {
        return (status.mode >> 6U) & 7U;
    }
    return (credentials.isIn(status.group) ? status.mode >> 3U : status.mode) & 7U;
}

}  // namespace

Credentials Credentials::ofThisProcess() {
    Credentials credentials;
    credentials.user = ::geteuid();
    const int count = ::getgroups(0, nullptr);
    if (count > 0) {
        credentials.groups.resize(static_cast<std::size_t>(count));
        const int got = ::getgroups(count, credentials.groups.data());
        credentials.groups.resize(static_cast<std::size_t>(std::max(got, 0)));
    }
    credentials.groups.push_back(::getegid());
    const std::uint64_t capabilities = effectiveCapabilities();
    credentials.overridesAccess = has(capabilities, CAP_DAC_OVERRIDE);
    credentials.overridesReading =
        credentials.overridesAccess || has(capabilities, CAP_DAC_READ_SEARCH);
    return credentials;
}

bool Credentials::isIn(std::uint32_t group) const {
    return std::ranges::find(groups, group) != groups.end();
}

bool dependsOnAccessList(const EntryStatus& status, const Credentials& credentials) {
    if (status.isSymbolicLink()) {
        return false;
    }
    if (credentials.overridesAccess) {
        return looksForeign(status);
    }
    return status.owner != credentials.user;
}

Access computeAccess(const EntryStatus& status, const Credentials& credentials, Mount mount) {
    const std::uint32_t bits = status.isSymbolicLink() ? 7U : permissionBits(status, credentials);
    Access access;
    access.readable = credentials.overridesReading || (bits & readBit) != 0;
    access.writable = mount == Mount::writable && !status.isImmutable &&
                      (credentials.overridesAccess || (bits & writeBit) != 0);
    return access;
}

Access askAccess(int directory, const char* name) {
    const auto allowed = [&](int wanted) {
        return ::faccessat(directory, name, wanted, AT_EACCESS | AT_SYMLINK_NOFOLLOW) == 0;
    };
    return {allowed(R_OK), allowed(W_OK)};
}

Mount mountOf(int descriptor) {
    struct statfs found{};
    const bool readOnly = ::fstatfs(descriptor, &found) == 0 && (found.f_flags & ST_RDONLY) != 0;
    return readOnly ? Mount::readOnly : Mount::writable;
}

}  // namespace marrowdale::native
