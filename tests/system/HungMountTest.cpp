// A mount that nobody serves any more: whoever asks it anything waits for ever. What does not lie
// in it is served all the same.

#include <array>
#include <fcntl.h>
#include <optional>
#include <sys/mount.h>

#include <gmock/gmock.h>

#include "platform/linux/files/UniqueFD.h"
#include "tests/system/ApplicationHome.h"
#include "tests/system/Service.h"

namespace marrowdale::tests {
namespace {

using ::testing::Contains;
using ::testing::HasSubstr;
using ::testing::Not;

// Served through a descriptor that nobody reads.
class HungMount {
  public:
    explicit HungMount(std::string target)
        : server_(::open("/dev/fuse", O_RDWR | O_CLOEXEC)), target_(std::move(target)) {
        const std::string options = "fd=" + std::to_string(server_.get()) +
                                    ",rootmode=40000,user_id=0,group_id=0,allow_other";
        isMounted_ = server_ && ::mount("hung", target_.c_str(), "fuse", MS_NOSUID | MS_NODEV,
                                        options.c_str()) == 0;
    }
    HungMount(const HungMount&) = delete;
    HungMount& operator=(const HungMount&) = delete;
    ~HungMount() {
        if (isMounted_) {
            ::umount2(target_.c_str(), MNT_DETACH | UMOUNT_NOFOLLOW);
        }
    }
    explicit operator bool() const { return isMounted_; }

  private:
    native::UniqueFD server_;
    const std::string target_;
    bool isMounted_ = false;
};

class HungMountTest : public testing::TestWithParam<std::string> {
  protected:
    HungMountTest() {
        home_.install("org.example.Hung", "Hung");
        home_.install("org.example.Well", "Well");
        writeFile(home_.library("org.example.Well") + "/inside", "x");
        makeFolder(home_.document("folder"));
        writeFile(home_.document("mine"), "x");
        EXPECT_THAT(listed("root"), Contains("mine"));
    }
    // The names in a listing that ends in time.
    [[nodiscard]] std::vector<std::string> listed(const std::string& item) const {
        ChildProcess process(home_.command({"--json", "ls", item}));
        process.readOutput(SIZE_MAX, patience);
        process.kill();
        const ChildResult result = process.finish();
        EXPECT_EQ(result.exitCode, 0) << item << ": not answered in time, or " << result.errors;
        return field(parsedLines(result.output), "filename");
    }
    [[nodiscard]] std::string place() const { return home_.path(GetParam()); }

    void expectTheRest() const {
        if (HasFailure()) {
            return;  // each question would take all the time there is
        }
        EXPECT_THAT(listed("root"), Contains("mine"));
        EXPECT_THAT(listed("root"), Contains("Well"));
        EXPECT_THAT(listed("all-directories"), Contains("inside"));
        EXPECT_THAT(listed("#org.example.Well"), Contains("inside"));
    }

    ApplicationHome home_;
};

std::string placeName(const testing::TestParamInfo<std::string>& info) {
    static constexpr std::array names{"aFolder", "aLibrary", "anApplication"};
    return names.at(info.index);
}

INSTANTIATE_TEST_SUITE_P(At, HungMountTest,
                         testing::Values("Documents/folder", ".var/app/org.example.Hung/Documents",
                                         ".var/app/org.example.Hung"),
                         placeName);

// Known: what comes to be mounted on a library that is being served, or above it, is in the way of
// every look at that library, and whoever looks holds the others up.
class MountThatComesTest : public HungMountTest {};

INSTANTIATE_TEST_SUITE_P(At, MountThatComesTest, testing::Values("Documents/folder"), placeName);

TEST_P(HungMountTest, holdsUpNoCommand) {
    const HungMount mount(place());
    if (!mount) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    expectTheRest();
    const bool isFolder = GetParam() == "Documents/folder";
    EXPECT_THAT(listed("root"), isFolder ? Not(Contains("folder")) : Not(Contains("Hung")));
}

TEST_P(HungMountTest, holdsUpNoServiceThatStartsOverIt) {
    const HungMount mount(place());
    if (!mount) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    Service service(home_);
    EXPECT_THAT(service.ready(), HasSubstr("serving"));
    expectTheRest();
    EXPECT_EQ(service.end().exitCode, 0);
}

TEST_P(MountThatComesTest, holdsUpNoServiceThatRuns) {
    Service service(home_);
    expectTheRest();
    std::optional<HungMount> mount(place());
    if (!*mount) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    expectTheRest();
    writeFile(home_.document("later"), "x");
    EXPECT_THAT(listed("root"), Contains("later"));
    mount.reset();
    expectTheRest();
    EXPECT_EQ(service.end().exitCode, 0);
}

}  // namespace
}  // namespace marrowdale::tests
