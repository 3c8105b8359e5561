#include <gtest/gtest.h>

#include "host/daemon/Environment.h"

namespace marrowdale::host {
namespace {

TEST(EnvironmentTest, aVariableThatIsEmptyCountsAsUnset) {
    const Environment environment({{"SET", "x"}, {"EMPTY", ""}}, "/work");
    EXPECT_EQ(environment.variable("SET"), "x");
    EXPECT_EQ(environment.variable("EMPTY"), std::nullopt);
    EXPECT_EQ(environment.variable("UNSET"), std::nullopt);
}

TEST(EnvironmentTest, aRelativePathLiesBelowTheWorkingFolder) {
    EXPECT_EQ(Environment({}, "/home/u").absolutePath("a/../b"), "/home/u/a/../b");
    EXPECT_EQ(Environment({}, "/").absolutePath("a"), "/a");
    EXPECT_EQ(Environment({}, "/home/u").absolutePath("/etc"), "/etc");
}

TEST(EnvironmentTest, thatOfTheProcessHasItsVariablesAndItsFolder) {
    const Environment environment = Environment::ofProcess();
    EXPECT_TRUE(environment.variable("PATH").has_value());
    EXPECT_TRUE(environment.workingFolder().starts_with('/'));
}

}  // namespace
}  // namespace marrowdale::host
