#include <set>

#include <gtest/gtest.h>

#include "host/browser/Secrets.h"
#include "host/browser/Sessions.h"

namespace marrowdale::host {
namespace {

TEST(SessionsTest, aLaunchTokenBeginsOneSession) {
    Sessions sessions;
    const std::string launch = sessions.newLaunch();
    EXPECT_FALSE(sessions.begin("", "client"));
    EXPECT_FALSE(sessions.begin(std::string(launch.size(), '0'), "client"));
    const auto session = sessions.begin(launch, "client");
    ASSERT_TRUE(session.has_value());
    EXPECT_FALSE(sessions.begin(launch, "client"));
    EXPECT_EQ(sessions.numberOf(session->token), session->number);
    EXPECT_EQ(sessions.numberOf(launch), std::nullopt);
    EXPECT_EQ(sessions.numberOf(""), std::nullopt);
    EXPECT_EQ(sessions.all().size(), 1U);
    EXPECT_EQ(sessions.all().front().client, "client");
}

TEST(SessionsTest, anEndedSessionIsNoneAnyMore) {
    Sessions sessions;
    const auto one = sessions.begin(sessions.newLaunch(), "one");
    const auto other = sessions.begin(sessions.newLaunch(), "other");
    const std::stop_token end = sessions.endOf(one->number);
    EXPECT_FALSE(end.stop_requested());
    EXPECT_TRUE(sessions.end(one->number));
    EXPECT_TRUE(end.stop_requested());
    EXPECT_FALSE(sessions.end(one->number));
    EXPECT_FALSE(sessions.has(one->number));
    EXPECT_EQ(sessions.numberOf(one->token), std::nullopt);
    EXPECT_EQ(sessions.numberOf(other->token), other->number);
}

TEST(SessionsTest, thereIsABoundOnBoth) {
    Sessions sessions;
    const std::string first = sessions.newLaunch();
    for (std::size_t i = 0; i < Sessions::mostLaunches; ++i) {
        std::ignore = sessions.newLaunch();
    }
    EXPECT_FALSE(sessions.begin(first, "too late"));
    std::vector<std::string> tokens;
    for (std::size_t i = 0; i <= Sessions::mostSessions; ++i) {
        tokens.push_back(sessions.begin(sessions.newLaunch(), "client")->token);
        // The first stays in use.
        EXPECT_TRUE(sessions.numberOf(tokens.front()));
    }
    EXPECT_EQ(sessions.all().size(), Sessions::mostSessions);
    EXPECT_FALSE(sessions.numberOf(tokens[1]));
}

TEST(SecretsTest, secretsAreLongAndNeverTheSame) {
    std::set<std::string> seen;
    for (int i = 0; i < 1000; ++i) {
        const std::string secret = newSecret();
        EXPECT_EQ(secret.size(), 64U);
        EXPECT_TRUE(seen.insert(secret).second);
    }
}

TEST(SecretsTest, signaturesAreThoseOfTheStandard) {
    // RFC 4231, test case 2.
    EXPECT_EQ(signatureOf("Jefe", "what do ya want for nothing?"),
              "5bdcc146bf60754e6a042426089575c75a003f089d2739839dec58b964ec3843");
}

TEST(SecretsTest, secretsAreComparedAsAWhole) {
    EXPECT_TRUE(areSameSecret("abc", "abc"));
    EXPECT_FALSE(areSameSecret("abc", "abd"));
    EXPECT_FALSE(areSameSecret("abc", "ab"));
    EXPECT_FALSE(areSameSecret("", "a"));
}

}  // namespace
}  // namespace marrowdale::host
