#pragma once

#include <optional>
#include <string>

#include <gtest/gtest.h>

#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestSkip.h"
#include "tests/powerloss/DiskFormat.h"
#include "tests/powerloss/LoggedImage.h"
#include "tests/powerloss/LoopMount.h"

namespace marrowdale::tests {

// Why no disk can be logged here; empty when one can. From the first call on this process has a
// mount namespace of its own, so whatever it mounts goes with it, however it ends.
[[nodiscard]] std::string whyNoPowerLoss();

// Gives a test two folders to mount on, for an image and for the file system in it.
class PowerLossTestBase : public testing::Test {
  protected:
    void SetUp() override;
    [[nodiscard]] std::string imageFolder() const { return directory_.path("image"); }
    // Absolute; the same through all mounts, as a disk's place is through a power cut.
    [[nodiscard]] std::string diskFolder() const { return directory_.path("disk"); }
    // Fails the test where the mount is refused.
    [[nodiscard]] std::optional<LoopMount> mount(const std::string& image,
                                                 const DiskFormat& format) const;

  private:
    TemporaryDirectory directory_;
};

// Leaves the test where the kernel does not know the file system.
#define MARROWDALE_SKIP_WITHOUT(format)                                    \
    do {                                                                   \
        if (!::marrowdale::tests::kernelKnows(format)) {                   \
            MARROWDALE_SKIP("this kernel does not have " + (format).name); \
        }                                                                  \
    } while (false)

[[nodiscard]] bool kernelKnows(const DiskFormat& format);

}  // namespace marrowdale::tests
