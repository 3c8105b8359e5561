#include <filesystem>

#include <gtest/gtest.h>

#include "host/daemon/Applications.h"
#include "platform/foundation/Semaphore.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

using Refusal = native::DataContainers::Refusal;

class HostApplicationsTest : public ::testing::Test {
  protected:
    HostApplicationsTest() {
        makeFolder(folder_.path("Documents"));
        makeFolder(folder_.path(".local/share/applications"));
    }
    [[nodiscard]] ApplicationsOptions options() const {
        return {.storageRoot = folder_.path("Documents"),
                .cacheFolder = folder_.path("cache"),
                .iconProgramPath = folder_.path("none"),
                .variable = [home = folder_.path(),
                             data = folder_.path("system")](std::string_view name) {
                    return name == "HOME"            ? std::optional(home)
                           : name == "XDG_DATA_DIRS" ? std::optional(data)
                                                     : std::nullopt;
                }};
    }
    void install(const std::string& identifier, const std::string& lines) const {
        writeFile(folder_.path(".local/share/applications/" + identifier + ".desktop"),
                  "[Desktop Entry]\nType=Application\nName=x\n" + lines);
    }
    TemporaryDirectory folder_;
};

TEST_F(HostApplicationsTest, findingsTellOfPackagesAndRefusedDocuments) {
    Applications applications(options());
    auto findings = applications.findings();
    ASSERT_EQ(findings.size(), 2U);
    EXPECT_EQ(findings[0].name, "package-extensions");
    EXPECT_EQ(findings[1].name, "refused-libraries");
    EXPECT_EQ(findings[1].status, FindingStatus::ok);
    install("org.example.Sketch", "X-KvPackageExtensions=sketch;note;\n");
    findings = applications.findings();
    EXPECT_EQ(findings[0].message,
              "folders whose names end so are one document, as applications say: .note, .sketch");
    EXPECT_EQ(findings[0].status, FindingStatus::ok);
}

TEST_F(HostApplicationsTest, eachRefusalIsToldWithItsReason) {
    const Finding finding = refusedLibrariesFinding({{"org.example.A", Refusal::otherVolume},
                                                     {"org.example.B", Refusal::unreadable},
                                                     {"org.example.C", Refusal::overlapping}});
    EXPECT_EQ(finding.status, FindingStatus::note);
    EXPECT_EQ(finding.message,
              "documents of these applications are left out: org.example.A (on another volume than "
              "the storage root), org.example.B (not readable), org.example.C (inside the storage "
              "root, or around it)");
    EXPECT_FALSE(finding.advice.empty());
}

TEST_F(HostApplicationsTest, iconsCostNothingBeforeTheyAreAskedFor) {
    Applications applications(options());
    install("org.example.Notes", "");
    const auto record = applications.registry().bundleRecordForIdentifier("org.example.Notes");
    ASSERT_TRUE(record);
    EXPECT_FALSE(std::filesystem::exists(folder_.path("cache")));
    EXPECT_TRUE(record->iconDataForVariant(0));
    applications.forgetIcons();
    EXPECT_TRUE(record->iconDataForVariant(0));
}

TEST_F(HostApplicationsTest, changesAreNoticedUntilNobodyWatches) {
    Applications applications(options());
    Semaphore changed;
    applications.watch([&] { changed.signal(); });
    install("org.example.Notes", "");
    changed.wait();
    applications.stopWatching();
}

}  // namespace
}  // namespace marrowdale::host
