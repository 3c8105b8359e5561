#include <gtest/gtest.h>

#include "host/browser/HttpHead.h"

namespace marrowdale::host {
namespace {

using namespace std::string_literals;

std::expected<HttpHead, HeadFault> parsed(const std::string& fields,
                                          const std::string& first = "GET / HTTP/1.1") {
    return HttpHead::parsed(first + "\r\n" + fields + "\r\n");
}

// The fault of a head; a value where there is none fails the comparison.
std::optional<HeadFault> faultOf(const std::string& fields,
                                 const std::string& first = "GET / HTTP/1.1") {
    const auto head = parsed(fields, first);
    return head ? std::nullopt : std::optional(head.error());
}

TEST(HttpHeadTest, aHeadIsTakenApart) {
    const auto head = parsed("Host: a\r\nX-Thing:\t two words \r\nContent-Length: 12\r\n",
                             "POST /a%20b?c=d HTTP/1.1");
    ASSERT_TRUE(head.has_value());
    EXPECT_EQ(head->method, "POST");
    EXPECT_EQ(head->target, "/a%20b?c=d");
    EXPECT_EQ(head->field("host"), "a");
    EXPECT_EQ(head->field("x-thing"), "two words");
    EXPECT_EQ(head->contentLength, 12U);
    EXPECT_TRUE(head->hasLength);
    EXPECT_TRUE(head->keepsAlive);
    EXPECT_FALSE(parsed("Connection: Close\r\n")->keepsAlive);
    EXPECT_FALSE(parsed("")->hasLength);
}

TEST(HttpHeadTest, aLengthIsToldOnceAndInDigits) {
    for (const char* fields :
         {"Content-Length: 3\r\nContent-Length: 4\r\n",
          "Content-Length: 3\r\nContent-Length: 3\r\n", "Content-Length: 3, 3\r\n",
          "Content-Length: +3\r\n", "Content-Length: -1\r\n", "Content-Length: 0x10\r\n",
          "Content-Length:\r\n", "Content-Length: 3 3\r\n",
          "Content-Length: 99999999999999999999\r\n"}) {
        EXPECT_EQ(faultOf(fields), HeadFault::malformed) << fields;
    }
}

TEST(HttpHeadTest, aBodyWithoutALengthIsRefused) {
    EXPECT_EQ(faultOf("Transfer-Encoding: chunked\r\n"), HeadFault::unknownEncoding);
    EXPECT_EQ(faultOf("Transfer-Encoding: chunked\r\nContent-Length: 3\r\n"),
              HeadFault::unknownEncoding);
}

TEST(HttpHeadTest, aFieldIsOneLineWithANameInFrontOfItsColon) {
    for (const std::string& fields :
         {"A: b\r\n c\r\n"s, "A: b\r\n\tc\r\n"s, " A: b\r\n"s, "A : b\r\n"s, "A\r\n"s, ": b\r\n"s,
          "A: b\rc\r\n"s, "A: b\0c\r\n"s, "A: \x7F\r\n"s, "A\xC3\xA4: b\r\n"s}) {
        EXPECT_EQ(faultOf(fields), HeadFault::malformed) << fields;
    }
    EXPECT_EQ(parsed("A: \xC3\xA4\r\n")->field("a"), "\xC3\xA4");
}

TEST(HttpHeadTest, theFirstLineIsMethodPathAndVersion) {
    for (const char* first :
         {"GET", "GET /", "GET  / HTTP/1.1", "GET /a b HTTP/1.1", "GET a HTTP/1.1",
          "GET http://x/ HTTP/1.1", "GET * HTTP/1.1", "GET /# HTTP/1.1", "GET / FTP/1.1",
          " GET / HTTP/1.1", "G\x01T / HTTP/1.1", "GET /\xC3\xA4 HTTP/1.1", ""}) {
        EXPECT_EQ(faultOf("", first), HeadFault::malformed) << first;
    }
    for (const char* first : {"GET / HTTP/1.0", "GET / HTTP/2.0", "GET / HTTP/1.10"}) {
        EXPECT_EQ(faultOf("", first), HeadFault::unknownVersion) << first;
    }
}

TEST(HttpHeadTest, thereIsAnEndToFields) {
    std::string fields;
    for (int i = 0; i < 100; ++i) {
        fields += "A: b\r\n";
    }
    EXPECT_EQ(faultOf(fields), std::nullopt);
    EXPECT_EQ(faultOf(fields + "A: b\r\n"), HeadFault::malformed);
}

TEST(HttpHeadTest, aFieldThatComesTwiceHasNoValue) {
    const auto head = parsed("Host: a\r\nHost: a\r\n");
    EXPECT_EQ(head->count("host"), 2U);
    EXPECT_EQ(head->field("host"), std::nullopt);
}

TEST(HttpHeadTest, theEndIsFoundAsSoonAsItHasCome) {
    const std::string head = "GET / HTTP/1.1\r\nHost: a\r\n\r\n";
    for (std::size_t size = 0; size < head.size(); ++size) {
        const auto end = HttpHead::endOf(head.substr(0, size));
        ASSERT_TRUE(end.has_value());
        EXPECT_EQ(*end, std::nullopt) << size;
    }
    EXPECT_EQ(*HttpHead::endOf(head), head.size());
    EXPECT_EQ(*HttpHead::endOf(head + "\nbody\n"), head.size());
}

TEST(HttpHeadTest, bareLineFeedsAndEndlessHeadsAreRefusedAtOnce) {
    EXPECT_EQ(HttpHead::endOf("GET / HTTP/1.1\n").error(), HeadFault::malformed);
    EXPECT_EQ(HttpHead::endOf("\nGET / HTTP/1.1\r\n").error(), HeadFault::malformed);
    EXPECT_EQ(HttpHead::endOf("GET / HTTP/1.1\r\nA: b\n\r\n\r\n").error(), HeadFault::malformed);
    const std::string first = "GET / HTTP/1.1\r\nA: ";
    const std::string rest(HttpHead::longestHead - first.size() - 1, 'x');
    EXPECT_EQ(*HttpHead::endOf(first + rest), std::nullopt);
    EXPECT_EQ(HttpHead::endOf(first + rest + "x").error(), HeadFault::tooLarge);
}

}  // namespace
}  // namespace marrowdale::host
