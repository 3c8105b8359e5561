#pragma once

#include <cerrno>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"

namespace marrowdale::native {

// What is wrong with a store's files, as errors. EBADMSG is damage (the kernel's own code for a
// checksum that does not check, so that its findings count too), EPROTO a later format; anything
// else is the system's refusal to read, which says nothing about the bytes.

[[nodiscard]] inline Error damageOf(const std::string& path, std::string_view what) {
    return errorWithPOSIXCode(EBADMSG, "check", path + " (" + std::string(what) + ")");
}
[[nodiscard]] inline Error laterFormatOf(const std::string& path, unsigned version) {
    return errorWithPOSIXCode(EPROTO, "read",
                              path + " (format version " + std::to_string(version) +
                                  ", which a later version of this program wrote)");
}
[[nodiscard]] inline bool isDamage(const Error& error) {
    return error.domain == ErrorDomain::posix && error.code == EBADMSG;
}
// A file of the store that is not there is damage; other errors stay what they are.
[[nodiscard]] inline Error missingIsDamage(const Error& error, const std::string& path) {
    return error.code == ENOENT ? damageOf(path, "missing") : error;
}

}  // namespace marrowdale::native
