#include "host/browser/RequestGuard.h"

#include <algorithm>
#include <array>

namespace marrowdale::host {

namespace {

constexpr unsigned badRequest = 400;
constexpr unsigned forbidden = 403;
constexpr unsigned methodNotAllowed = 405;
constexpr unsigned unsupportedContent = 415;
constexpr unsigned misdirected = 421;

constexpr std::array<std::string_view, 4> methods{"GET", "POST", "PUT", "DELETE"};

bool onlyReads(const HttpHead& head) {
    return head.method == "GET";
}

// A whole window that goes to the page.
bool isNavigationToThePage(const HttpHead& head) {
    return head.method == "GET" && head.target == "/" &&
           head.field("sec-fetch-mode") == "navigate" && head.field("sec-fetch-dest") == "document";
}

}  // namespace

RequestGuard::RequestGuard(std::uint16_t port)
    : hosts_{"127.0.0.1:" + std::to_string(port), "localhost:" + std::to_string(port)} {}

std::optional<RequestGuard::Refusal> RequestGuard::refusal(const HttpHead& head) const {
    if (head.count("host") != 1) {
        return Refusal{badRequest, "one Host is wanted"};
    }
    if (std::ranges::find(hosts_, *head.field("host")) == hosts_.end()) {
        return Refusal{misdirected, "this is another host"};
    }
    if (std::ranges::find(methods, head.method) == methods.end()) {
        return Refusal{methodNotAllowed, "no such method"};
    }
    if (auto refused = originRefusal(head)) {
        return refused;
    }
    return contentRefusal(head);
}

std::optional<RequestGuard::Refusal> RequestGuard::originRefusal(const HttpHead& head) const {
    constexpr Refusal foreign{forbidden, "only the document browser's own page is answered"};
    const bool hasOrigin = head.count("origin") > 0;
    const bool isOurs =
        head.field("origin") == "http://" + std::string(head.field("host").value_or(""));
    if ((hasOrigin && !isOurs) || (!onlyReads(head) && !isOurs)) {
        return foreign;
    }
    if (head.count("sec-fetch-site") == 0) {
        return std::nullopt;
    }
    const auto site = head.field("sec-fetch-site");
    // "none" is a person: an address that was typed, or a bookmark.
    const bool isFine = site == "same-origin" || (site == "none" && onlyReads(head));
    return isFine || isNavigationToThePage(head) ? std::nullopt : std::optional(foreign);
}

std::optional<RequestGuard::Refusal> RequestGuard::contentRefusal(const HttpHead& head) {
    if (onlyReads(head)) {
        return head.contentLength == 0
                   ? std::nullopt
                   : std::optional(Refusal{badRequest, "a request that reads has no content"});
    }
    const auto type = head.field("content-type");
    if (head.method == "POST" && type != "application/json") {
        return Refusal{unsupportedContent, "application/json is wanted"};
    }
    if (head.method == "PUT" && (type != "application/octet-stream" || !head.hasLength)) {
        return Refusal{unsupportedContent, "application/octet-stream of a known length is wanted"};
    }
    return std::nullopt;
}

}  // namespace marrowdale::host
