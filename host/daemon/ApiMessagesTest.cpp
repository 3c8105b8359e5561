#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/ApiMessages.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;

TEST(ApiMessagesTest, aTargetIsItsSegmentsAndParametersDecoded) {
    const auto request =
        ApiRequest::fromTarget("GET", "/v1/items/%23org.example%2FA/x?a=1&b=%FF&a=2&&c&d=a=b");
    ASSERT_TRUE(request.has_value());
    EXPECT_EQ(request->method, "GET");
    EXPECT_THAT(request->path, ElementsAre("v1", "items", "#org.example/A", "x"));
    EXPECT_EQ(request->parameter("a"), "1");
    EXPECT_THAT(request->parameters("a"), ElementsAre("1", "2"));
    EXPECT_EQ(request->parameter("b"), "\xFF");
    EXPECT_EQ(request->parameter("c"), "");
    EXPECT_EQ(request->parameter("d"), "a=b");
    EXPECT_EQ(request->parameter("e"), std::nullopt);
}

TEST(ApiMessagesTest, whatIsNoPathOrEncodedWronglyIsNoRequest) {
    for (const char* target : {"", "x", "*", "http://x/", "/%", "/%4", "/%ZZ", "/a?b=%"}) {
        EXPECT_FALSE(ApiRequest::fromTarget("GET", target).has_value()) << target;
    }
    EXPECT_THAT(ApiRequest::fromTarget("GET", "/")->path, ElementsAre(""));
    EXPECT_THAT(ApiRequest::fromTarget("GET", "/?")->path, ElementsAre(""));
}

}  // namespace
}  // namespace marrowdale::host
