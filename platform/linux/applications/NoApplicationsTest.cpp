#include <gtest/gtest.h>

#include "platform/linux/applications/NoApplications.h"

namespace marrowdale::native {
namespace {

TEST(NoApplicationsTest, knowsNoApplicationAndServesNoDocumentsFolder) {
    NoApplications applications;
    EXPECT_EQ(applications.proxyFor(URL::fileURL("/home/u/.var/app/org.example.Notes/Documents"),
                                    URLRelationship::same),
              nullptr);
    EXPECT_EQ(applications.bundleRecordForIdentifier("org.example.Notes"), nullptr);
    EXPECT_TRUE(applications.documentFolders().empty());
}

}  // namespace
}  // namespace marrowdale::native
