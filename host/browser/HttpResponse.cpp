#include "host/browser/HttpResponse.h"

#include <algorithm>
#include <array>
#include <cerrno>

#include "host/requests/ErrorJson.h"
#include "host/requests/JsonWriter.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

using Field = std::pair<std::string, std::string>;

const std::array<Field, 7>& usualFields() {
    static const std::array<Field, 7> fields{{
        {"Cache-Control", "no-store"},
        {"Content-Security-Policy", "default-src 'none'; frame-ancestors 'none'; sandbox"},
        {"Cross-Origin-Opener-Policy", "same-origin"},
        {"Cross-Origin-Resource-Policy", "same-origin"},
        {"Referrer-Policy", "no-referrer"},
        {"X-Content-Type-Options", "nosniff"},
        {"X-Frame-Options", "DENY"},
    }};
    return fields;
}

std::string_view phraseOf(unsigned status) {
    switch (status) {
        case 200:
            return "OK";
        case 206:
            return "Partial Content";
        case 304:
            return "Not Modified";
        default:
            return status < 400 ? "Done" : "Refused";
    }
}

std::string lineOf(std::string_view name, std::string_view value) {
    return std::string(name) + ": " + std::string(value) + "\r\n";
}

}  // namespace

std::string headOf(const BrowserResponse& response, std::optional<std::uint64_t> length,
                   bool keepsAlive) {
    std::string text = "HTTP/1.1 " + std::to_string(response.status) + " " +
                       std::string(phraseOf(response.status)) + "\r\n";
    for (const auto& [name, value] : response.fields) {
        text += lineOf(name, value);
    }
    for (const auto& [name, value] : usualFields()) {
        if (std::ranges::find(response.fields, name, &Field::first) == response.fields.end()) {
            text += lineOf(name, value);
        }
    }
    if (length) {
        text += lineOf("Content-Length", std::to_string(*length));
    } else if (response.source) {
        text += lineOf("Transfer-Encoding", "chunked");
    }
    text += keepsAlive ? "" : lineOf("Connection", "close");
    return text + "\r\n";
}

std::string headOfEvents() {
    BrowserResponse response;
    response.fields.emplace_back("Content-Type", "text/event-stream");
    return headOf(response, std::nullopt, false);
}

BrowserResponse responseOf(ApiAnswer answer) {
    BrowserResponse response;
    response.status = answer.status;
    response.fields.emplace_back("Content-Type", std::move(answer.contentType));
    response.body = std::move(answer.body);
    return response;
}

BrowserResponse refusalOf(unsigned status, std::string_view reason) {
    JsonWriter writer;
    writer.beginObject().key("error").beginObject();
    writer.key("domain").string("MarrowdaleBrowser").key("code").number(std::uint64_t{status});
    writer.key("name").string("refused").key("message").string(reason);
    writer.endObject().endObject();
    return responseOf(ApiAnswer{.status = status, .body = writer.take()});
}

BrowserResponse responseOf(const Error& error) {
    constexpr unsigned notFound = 404;
    constexpr unsigned conflict = 409;
    constexpr unsigned forbidden = 403;
    constexpr unsigned badRequest = 400;
    constexpr unsigned serverError = 500;
    unsigned status = serverError;
    if (error.domain == ErrorDomain::fileProvider) {
        const auto code = static_cast<FileProviderErrorCode>(error.code);
        status = code == FileProviderErrorCode::noSuchItem          ? notFound
                 : code == FileProviderErrorCode::filenameCollision ? conflict
                                                                    : badRequest;
    } else if (error == errorFileWriteNoPermission()) {
        status = forbidden;
    }
    return responseOf(ApiAnswer{.status = status, .body = errorJson(error)});
}

}  // namespace marrowdale::host
