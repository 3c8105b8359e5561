#pragma once

#include <cstdint>
#include <vector>

#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// Who this process is to the file system. Plain data.
struct Credentials {
    std::uint32_t user = 0;
    std::vector<std::uint32_t> groups;  // the main one and the others
    bool overridesAccess = false;       // may read and write whatever the bits say
    bool overridesReading = false;      // may read whatever the bits say

    [[nodiscard]] static Credentials ofThisProcess();
    [[nodiscard]] bool isIn(std::uint32_t group) const;
};

struct Access {
    bool readable = false;
    bool writable = false;
    friend bool operator==(const Access&, const Access&) = default;
};

// Whether an access list on the file could make a difference to what `computeAccess` says: the
// owner's rights and a privileged process's never come from one.
[[nodiscard]] bool dependsOnAccessList(const EntryStatus& status, const Credentials& credentials);

enum class Mount : bool { writable, readOnly };

// What the permission bits allow, without a system call. Right only where the file has no access
// list, or one that makes no difference.
[[nodiscard]] Access computeAccess(const EntryStatus& status, const Credentials& credentials,
                                   Mount mount);

// What the kernel says, access lists included; `name` as in statEntry, not empty.
[[nodiscard]] Access askAccess(int directory, const char* name);

// Whether the open file (O_PATH is enough) lies on a mount that refuses writing. Not known:
// writable.
[[nodiscard]] Mount mountOf(int descriptor);

}  // namespace marrowdale::native
