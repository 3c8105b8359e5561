#include <gtest/gtest.h>

#include "host/browser/RequestGuard.h"

namespace marrowdale::host {
namespace {

constexpr std::uint16_t port = 8000;
constexpr const char* host = "127.0.0.1:8000";
constexpr const char* origin = "http://127.0.0.1:8000";

using Fields = std::vector<std::pair<std::string, std::string>>;

HttpHead headOf(std::string method, Fields fields, std::string target = "/v1/service") {
    HttpHead head;
    head.method = std::move(method);
    head.target = std::move(target);
    head.fields = std::move(fields);
    return head;
}

// The status of a refusal; 0 where there is none.
unsigned refused(const HttpHead& head) {
    const auto refusal = RequestGuard(port).refusal(head);
    return refusal ? refusal->status : 0;
}

TEST(RequestGuardTest, oneHostOfTheListIsWanted) {
    EXPECT_EQ(refused(headOf("GET", {{"host", host}})), 0U);
    EXPECT_EQ(refused(headOf("GET", {{"host", "localhost:8000"}})), 0U);
    EXPECT_EQ(refused(headOf("GET", {})), 400U);
    EXPECT_EQ(refused(headOf("GET", {{"host", host}, {"host", host}})), 400U);
    for (const char* other :
         {"127.0.0.1", "127.0.0.1:8001", "localhost", "evil.example:8000", "127.0.0.1:8000.",
          "127.0.0.1:8000@evil.example", "LOCALHOST:8000", "[::1]:8000", "127.1:8000", ""}) {
        EXPECT_EQ(refused(headOf("GET", {{"host", other}})), 421U) << other;
    }
}

TEST(RequestGuardTest, pagesOfOtherOriginsAreRefused) {
    for (const char* site : {"cross-site", "same-site", "nonsense", ""}) {
        EXPECT_EQ(refused(headOf("GET", {{"host", host}, {"sec-fetch-site", site}})), 403U) << site;
        EXPECT_EQ(refused(headOf("POST", {{"host", host},
                                          {"origin", origin},
                                          {"content-type", "application/json"},
                                          {"sec-fetch-site", site}})),
                  403U)
            << site;
    }
    for (const char* other : {"null", "http://evil.example", "http://127.0.0.1:8001",
                              "http://localhost:8000", "https://127.0.0.1:8000", ""}) {
        EXPECT_EQ(refused(headOf("GET", {{"host", host}, {"origin", other}})), 403U) << other;
    }
    EXPECT_EQ(refused(headOf("GET", {{"host", host}, {"sec-fetch-site", "same-origin"}})), 0U);
    EXPECT_EQ(refused(headOf("GET", {{"host", host}, {"sec-fetch-site", "none"}})), 0U);
}

TEST(RequestGuardTest, aWindowMayComeToThePageFromAnywhere) {
    const Fields window{{"host", host},
                        {"sec-fetch-site", "cross-site"},
                        {"sec-fetch-mode", "navigate"},
                        {"sec-fetch-dest", "document"}};
    EXPECT_EQ(refused(headOf("GET", window, "/")), 0U);
    EXPECT_EQ(refused(headOf("GET", window, "/v1/service")), 403U);
    Fields frame = window;
    frame[3].second = "iframe";
    EXPECT_EQ(refused(headOf("GET", frame, "/")), 403U);
}

TEST(RequestGuardTest, whatChangesSomethingComesFromOurOwnOrigin) {
    for (const char* method : {"POST", "PUT", "DELETE"}) {
        const Fields typed{
            {"host", host},
            {"content-type",
             std::string(method) == "PUT" ? "application/octet-stream" : "application/json"}};
        EXPECT_EQ(refused(headOf(method, typed)), 403U) << method;
        Fields own = typed;
        own.emplace_back("origin", origin);
        HttpHead head = headOf(method, own);
        head.hasLength = true;
        EXPECT_EQ(refused(head), 0U) << method;
        head.fields.emplace_back("sec-fetch-site", "none");
        EXPECT_EQ(refused(head), 403U) << method;
        head.fields.back().second = "same-origin";
        EXPECT_EQ(refused(head), 0U) << method;
    }
}

TEST(RequestGuardTest, formsAndOtherMethodsAreRefused) {
    for (const char* type : {"text/plain", "application/x-www-form-urlencoded",
                             "multipart/form-data; boundary=x", "application/json;", ""}) {
        EXPECT_EQ(
            refused(headOf("POST", {{"host", host}, {"origin", origin}, {"content-type", type}})),
            415U)
            << type;
    }
    for (const char* method : {"OPTIONS", "TRACE", "CONNECT", "PATCH", "HEAD", "get"}) {
        EXPECT_EQ(refused(headOf(method, {{"host", host}})), 405U) << method;
    }
    HttpHead reading = headOf("GET", {{"host", host}});
    reading.contentLength = 1;
    EXPECT_EQ(refused(reading), 400U);
}

TEST(RequestGuardTest, anUploadTellsItsLength) {
    EXPECT_EQ(refused(headOf("PUT", {{"host", host},
                                     {"origin", origin},
                                     {"content-type", "application/octet-stream"}})),
              415U);
}

}  // namespace
}  // namespace marrowdale::host
