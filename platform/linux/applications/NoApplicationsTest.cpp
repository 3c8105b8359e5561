#include <gtest/gtest.h>

#include "platform/linux/applications/NoApplications.h"

namespace marrowdale::native {
namespace {

TEST(NoApplicationsTest, knowsNoApplication) {
    NoApplications applications;
    EXPECT_EQ(applications.proxyFor(URL::fileURL("/home/u/.var/app/org.example.Notes/Documents"),
                                    URLRelationship::same),
              nullptr);
    EXPECT_EQ(applications.bundleRecordForIdentifier("org.example.Notes"), nullptr);
    applications.enumerateApplications(ApplicationKind::user, [](const auto&) { FAIL(); });
    applications.enumerateApplications(ApplicationKind::system, [](const auto&) { FAIL(); });
}

}  // namespace
}  // namespace marrowdale::native
