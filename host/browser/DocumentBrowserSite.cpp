#include "host/browser/DocumentBrowserSite.h"

#include <cerrno>
#include <charconv>
#include <sys/statvfs.h>

#include <nlohmann/json.hpp>

#include "host/browser/ContentTypes.h"
#include "host/browser/DocumentFile.h"
#include "host/browser/HttpResponse.h"
#include "host/browser/StaticFiles.h"
#include "host/browser/ZipArchive.h"
#include "host/requests/FeedJson.h"
#include "host/requests/ItemJson.h"
#include "host/requests/JsonReading.h"
#include "host/requests/JsonWriter.h"

namespace marrowdale::host {

namespace {

constexpr unsigned partialContent = 206;
constexpr unsigned notModified = 304;
constexpr unsigned badRequest = 400;
constexpr unsigned unauthorized = 401;
constexpr unsigned forbidden = 403;
constexpr unsigned notFound = 404;
constexpr unsigned methodNotAllowed = 405;
constexpr unsigned unreachableRange = 416;

constexpr std::string_view sessionField = "marrowdale-session";

// Scripts, styles and the rest from the program alone, nothing from anywhere else, nothing inline.
constexpr const char* pagePolicy =
    "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; media-src 'self'; "
    "frame-src 'self'; connect-src 'self'; worker-src 'self'; base-uri 'none'; form-action 'none'; "
    "frame-ancestors 'none'; require-trusted-types-for 'script'; trusted-types marrowdale";
// What is shown in the page's own frame. (A sandbox keeps web browsers from showing PDF.)
constexpr const char* shownPolicy =
    "default-src 'none'; img-src 'self'; media-src 'self'; object-src 'self'; plugin-types "
    "application/pdf; style-src 'unsafe-inline'; frame-ancestors 'self'";

BrowserResponse jsonOf(std::string text) {
    return responseOf(ApiAnswer{.body = std::move(text)});
}

BrowserResponse pageFile(const StaticFile& file, const HttpHead& head) {
    BrowserResponse response;
    response.fields = {{"Content-Type", std::string(file.contentType)},
                       {"Cache-Control", "no-cache"},
                       {"Content-Security-Policy", pagePolicy},
                       {"ETag", std::string(file.tag)}};
    if (head.field("if-none-match") == file.tag) {
        response.status = notModified;
    } else {
        response.body = file.bytes;
    }
    return response;
}

std::string joined(const std::vector<std::string>& path) {
    std::string text;
    for (const std::string& segment : path) {
        text += (text.empty() ? "" : "/") + segment;
    }
    return text;
}

bool isAction(const ApiRequest& request) {
    return request.path.size() == 2 && request.path[1] == "actions";
}

// A page names no path of the machine: documents come in by uploads.
bool wantsImport(const ApiRequest& request) {
    const auto action = actionFromJson(request.body);
    return action && action->kind == ItemAction::Kind::import;
}

}  // namespace

DocumentBrowserSite::DocumentBrowserSite(HostService& service, std::uint16_t port)
    : service_(service),
      origin_("http://127.0.0.1:" + std::to_string(port)),
      guard_(port),
      uploads_(service.requests(), service.requests(),
               service.settings().stateFolder + "/uploads") {}

std::string DocumentBrowserSite::newLaunchAddress() {
    return origin_ + "/#launch=" + sessions_.newLaunch();
}

std::optional<BrowserResponse> DocumentBrowserSite::refusal(const HttpHead& head) {
    const auto refused = guard_.refusal(head);
    return refused ? std::optional(refusalOf(refused->status, refused->reason)) : std::nullopt;
}

BrowserResponse DocumentBrowserSite::fault(unsigned status, std::string_view reason) {
    return refusalOf(status, reason);
}

std::optional<std::uint64_t> DocumentBrowserSite::sessionOf(const BrowserRequest& request) {
    const auto token = request.head.field(sessionField);
    return token ? sessions_.numberOf(*token) : std::nullopt;
}

void DocumentBrowserSite::handle(const BrowserRequest& request,
                                 const std::shared_ptr<BrowserReply>& reply) {
    const ApiRequest& asked = request.request;
    if (asked.path.front() != "v1") {
        reply->respond(file(request));
        return;
    }
    if (asked.method == "POST" && joined(asked.path) == "v1/sessions") {
        reply->respond(beginSession(request));
        return;
    }
    const auto session = sessionOf(request);
    if (!session) {
        reply->respond(refusalOf(unauthorized, "no session: open the address that is printed"));
        return;
    }
    if (auto answer = ownAnswer(request, *session)) {
        reply->respond(std::move(*answer));
        return;
    }
    reply->endWith(sessions_.endOf(*session));
    service_.api().handle(asked, reply);
}

BrowserResponse DocumentBrowserSite::file(const BrowserRequest& request) {
    if (request.head.method != "GET") {
        return refusalOf(methodNotAllowed, "this is only read");
    }
    if (const auto place = addresses_.placeAt(request.request)) {
        return sessions_.has(place->session)
                   ? content(place->item, place->view, request.head)
                   : refusalOf(forbidden, "the session of this address has ended");
    }
    if (request.request.path.size() == 3 && request.request.path[0] == "files" &&
        request.request.path[1] == "archive") {
        return archive(request.request.path[2]);
    }
    if (request.request.path.front() == "files") {
        return refusalOf(forbidden, "this address is not good, or not any more");
    }
    const StaticFile* const found = staticFileAt(joined(request.request.path));
    return found != nullptr ? pageFile(*found, request.head)
                            : refusalOf(notFound, "there is nothing at this address");
}

BrowserResponse DocumentBrowserSite::beginSession(const BrowserRequest& request) {
    const auto body = parsedJson(request.request.body);
    const auto launch = body ? textMember(*body, "launch") : std::nullopt;
    const auto session =
        launch ? sessions_.begin(*launch, request.head.field("user-agent").value_or("unknown"))
               : std::nullopt;
    if (!session) {
        return refusalOf(forbidden, "this launch token is not good, or not any more");
    }
    JsonWriter writer;
    writer.beginObject().key("session").string(session->token);
    writer.key("number").number(session->number).endObject();
    return jsonOf(writer.take());
}

std::optional<BrowserResponse> DocumentBrowserSite::ownAnswer(const BrowserRequest& request,
                                                              std::uint64_t session) {
    const ApiRequest& asked = request.request;
    const std::string place = asked.method + " " + (asked.path.size() > 1 ? asked.path[1] : "");
    const std::size_t depth = asked.path.size();
    if (isAction(asked) && wantsImport(asked)) {
        return refusalOf(forbidden, "documents come in by uploads here");
    }
    if (place == "GET sessions" && depth == 2) {
        return sessions(session);
    }
    if (place == "DELETE sessions" && depth == 3) {
        return endSession(asked.path[2]);
    }
    if (place == "POST launches" && depth == 2) {
        return jsonOf(textJson("address", newLaunchAddress()));
    }
    if (place == "POST addresses" && depth == 2) {
        return newAddress(request, session);
    }
    if (place == "POST archives" && depth == 2) {
        return orderArchive(request, session);
    }
    if (place == "GET collections" && depth >= 3) {
        return collection(asked);
    }
    if (place == "GET tags" && depth == 2) {
        return tags();
    }
    if (place == "GET space" && depth == 2) {
        return space();
    }
    if (place == "GET items" && depth == 4 && asked.path[3] == "content") {
        return content(asked.path[2], SignedPlace::View::download, request.head);
    }
    if (place == "GET items" && depth == 4 && asked.path[3] == "put-back") {
        return putBackPlace(asked.path[2]);
    }
    return std::nullopt;
}

BrowserResponse DocumentBrowserSite::sessions(std::uint64_t ownNumber) {
    JsonWriter writer;
    writer.beginObject().key("sessions").beginArray();
    for (const Sessions::Session& session : sessions_.all()) {
        writer.beginObject().key("number").number(session.number);
        writer.key("client").string(session.client).key("begun").string(session.begun.rfc3339());
        writer.key("lastUsed").string(session.lastUsed.rfc3339());
        writer.key("isThis").boolean(session.number == ownNumber).endObject();
    }
    writer.endArray().endObject();
    return jsonOf(writer.take());
}

BrowserResponse DocumentBrowserSite::endSession(const std::string& number) {
    std::uint64_t value = 0;
    const char* const end = number.data() + number.size();
    const auto parsed = std::from_chars(number.data(), end, value);
    return parsed.ptr == end && parsed.ec == std::errc() && sessions_.end(value)
               ? jsonOf("{}")
               : refusalOf(notFound, "there is no such session");
}

BrowserResponse DocumentBrowserSite::newAddress(const BrowserRequest& request,
                                                std::uint64_t session) {
    const auto body = parsedJson(request.request.body);
    const auto item = body ? textMember(*body, "item") : std::nullopt;
    const auto view = body ? textMember(*body, "view") : std::nullopt;
    if (!item || !view || (*view != "content" && *view != "download")) {
        return refusalOf(badRequest, "an item, and content or download, are wanted");
    }
    const auto found = service_.requests().item(*item);
    if (!found) {
        return responseOf(found.error());
    }
    const SignedPlace place{
        *view == "content" ? SignedPlace::View::content : SignedPlace::View::download,
        (*found)->itemIdentifier, session};
    return jsonOf(textJson("address", addresses_.addressOf(place, (*found)->filename)));
}

BrowserResponse DocumentBrowserSite::orderArchive(const BrowserRequest& request,
                                                  std::uint64_t session) {
    const auto body = parsedJson(request.request.body);
    const auto* const items = body ? arrayMember(*body, "items") : nullptr;
    const auto name = body ? textMember(*body, "name") : std::nullopt;
    if (items == nullptr || items->empty() || items->size() > OrderedArchives::mostItems || !name) {
        return refusalOf(badRequest, "a name and some items are wanted, ten thousand at most");
    }
    OrderedArchives::Order order{.session = session, .name = *name, .items = {}};
    for (const auto& item : *items) {
        auto identifier = bytes(item);
        if (!identifier) {
            return refusalOf(badRequest, "identifiers are texts");
        }
        order.items.push_back(std::move(*identifier));
    }
    return jsonOf(textJson("address", "/files/archive/" + archives_.add(std::move(order))));
}

// What is gone by now is left out, as what goes while the archive is made.
BrowserResponse DocumentBrowserSite::archive(std::string_view secret) {
    const auto order = archives_.find(secret);
    if (!order || !sessions_.has(order->session)) {
        return refusalOf(forbidden, "this address is not good, or not any more");
    }
    std::vector<FileProviderItemPtr> items;
    for (const std::string& identifier : order->items) {
        auto item = service_.requests().item(identifier);
        if (item) {
            items.push_back(std::move(*item));
        }
    }
    BrowserResponse response;
    response.fields = {{"Content-Type", "application/zip"},
                       {"Content-Disposition", attachmentNamed(order->name)}};
    response.source = std::make_unique<ZipArchive>(std::move(items));
    return response;
}

BrowserResponse DocumentBrowserSite::collection(const ApiRequest& request) {
    ItemCollection wanted;
    if (request.path[2] == "recents") {
        wanted.kind = ItemCollection::Kind::recents;
    } else if (request.path[2] == "tagged") {
        wanted.kind = ItemCollection::Kind::tagged;
        wanted.tag = request.parameter("tag").value_or("");
    } else if (request.path[2] != "favorites") {
        return refusalOf(notFound, "there is no such collection");
    }
    const auto items = service_.requests().replica().collection(wanted);
    return items ? jsonOf(pageJson({.items = *items, .nextPage = std::nullopt}))
                 : responseOf(items.error());
}

BrowserResponse DocumentBrowserSite::tags() {
    const auto tags = service_.requests().replica().tags();
    if (!tags) {
        return responseOf(tags.error());
    }
    JsonWriter writer;
    writer.beginObject().key("tags").beginArray();
    for (const TagCount& count : *tags) {
        writer.beginObject().key("tag").string(count.tag);
        writer.key("items").number(count.items).endObject();
    }
    writer.endArray().endObject();
    return jsonOf(writer.take());
}

BrowserResponse DocumentBrowserSite::putBackPlace(const std::string& item) {
    const auto parent = service_.requests().putBackParent(item);
    const auto folder = parent ? service_.requests().item(*parent)
                               : Expected<FileProviderItemPtr>(FileProviderItemPtr());
    if (!folder) {
        return responseOf(folder.error());
    }
    JsonWriter writer;
    writer.beginObject().key("folder");
    if (*folder) {
        appendItem(writer, **folder);
    } else {
        writer.null();
    }
    writer.endObject();
    return jsonOf(writer.take());
}

BrowserResponse DocumentBrowserSite::space() {
    struct statvfs status{};
    const std::string& root = service_.settings().rootPath;
    if (::statvfs(root.c_str(), &status) != 0) {
        return responseOf(errorWithPOSIXCode(errno, "look at the disk of", root));
    }
    JsonWriter writer;
    writer.beginObject();
    writer.key("available").number(std::uint64_t{status.f_bavail} * status.f_frsize);
    writer.key("total").number(std::uint64_t{status.f_blocks} * status.f_frsize).endObject();
    return jsonOf(writer.take());
}

BrowserResponse DocumentBrowserSite::content(const std::string& item, SignedPlace::View view,
                                             const HttpHead& head) {
    const auto found = service_.requests().item(item);
    if (!found) {
        return responseOf(found.error());
    }
    auto document = DocumentFile::open(**found);
    if (!document) {
        return refusalOf(notFound, document.error().description());
    }
    const auto shown = view == SignedPlace::View::content
                           ? shownContentType((*found)->typeIdentifier)
                           : std::nullopt;
    BrowserResponse response;
    response.fields = {{"Content-Type", shown.value_or("application/octet-stream")},
                       {"Accept-Ranges", "bytes"},
                       {"ETag", document->tag()},
                       {"Last-Modified", document->lastModified()}};
    if (shown) {
        response.fields.emplace_back("Content-Security-Policy", shownPolicy);
        response.fields.emplace_back("X-Frame-Options", "SAMEORIGIN");
    }
    response.fields.emplace_back("Content-Disposition", shown
                                                            ? shownNamed((*found)->filename)
                                                            : attachmentNamed((*found)->filename));
    const bool isSame = head.count("if-range") == 0 || head.field("if-range") == document->tag();
    const std::uint64_t size = document->size();
    const auto range = requestedRange(isSame ? head.field("range") : std::nullopt, size);
    if (range.kind == RangeKind::unreachable) {
        response.status = unreachableRange;
        response.fields.emplace_back("Content-Range", "bytes */" + std::to_string(size));
        return response;
    }
    if (range.kind == RangeKind::part) {
        response.status = partialContent;
        response.fields.emplace_back(
            "Content-Range", "bytes " + std::to_string(range.range.first) + "-" +
                                 std::to_string(range.range.first + range.range.length - 1) + "/" +
                                 std::to_string(size));
    }
    response.length = range.range.length;
    response.source = std::move(*document).read(range.range);
    return response;
}

std::variant<std::unique_ptr<ContentSink>, BrowserResponse> DocumentBrowserSite::upload(
    const BrowserRequest& request) {
    if (!sessionOf(request)) {
        return refusalOf(unauthorized, "no session: open the address that is printed");
    }
    if (joined(request.request.path) != "v1/uploads") {
        return refusalOf(notFound, "nothing is taken at this address");
    }
    auto sink = uploads_.begin(request.request.parameter("parent").value_or(""),
                               request.request.parameter("name").value_or(""));
    if (!sink) {
        return responseOf(sink.error());
    }
    return std::move(*sink);
}

}  // namespace marrowdale::host
