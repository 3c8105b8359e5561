#pragma once

#include <cstdlib>
#include <string_view>
#include <unistd.h>

#include <gtest/gtest.h>

namespace marrowdale {

// Whether a test that can't run here fails instead of being skipped (MARROWDALE_TEST_NO_SKIP=1),
// as in CI, where everything that the tests need is there.
[[nodiscard]] inline bool skippingIsForbidden() {
    const char* value = std::getenv("MARROWDALE_TEST_NO_SKIP");  // NOLINT(concurrency-mt-unsafe)
    return value != nullptr && std::string_view(value) == "1";
}

#ifdef __has_feature
inline constexpr bool isThreadSanitized = __has_feature(thread_sanitizer);
#else
inline constexpr bool isThreadSanitized = false;  // only clang builds with that sanitizer
#endif

[[nodiscard]] inline bool runsAsRoot() {
    return ::geteuid() == 0;
}

}  // namespace marrowdale

// Leaves the test: something that it needs is missing on this machine. The reason names what.
#define MARROWDALE_SKIP(reason)                                                  \
    do {                                                                         \
        if (::marrowdale::skippingIsForbidden()) {                               \
            FAIL() << "can't run, and skipping is forbidden here: " << (reason); \
        }                                                                        \
        GTEST_SKIP() << (reason);                                                \
    } while (false)

// Leaves the test because of the user who runs it: permissions don't bind root, and only root may
// mount. The suite runs once as each, so nothing is lost and the skip is always allowed.
#define MARROWDALE_SKIP_FOR_USER(reason) GTEST_SKIP() << "as this user: " << (reason)

// Leaves the test where ThreadSanitizer is built in, for a reason that lies in how it works. The
// suite runs without it and with the other sanitizers too, so nothing is lost and the skip is
// always allowed.
#define MARROWDALE_SKIP_UNDER_SANITIZER(reason)                    \
    do {                                                           \
        if (::marrowdale::isThreadSanitized) {                     \
            GTEST_SKIP() << "under ThreadSanitizer: " << (reason); \
        }                                                          \
    } while (false)
