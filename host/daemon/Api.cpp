#include "host/daemon/Api.h"

#include <cerrno>
#include <chrono>
#include <mutex>
#include <unistd.h>

#include "host/requests/ErrorJson.h"
#include "host/requests/FeedJson.h"
#include "platform/foundation/Base64.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

constexpr unsigned noContent = 204;
constexpr unsigned badRequest = 400;
constexpr unsigned notFound = 404;
constexpr unsigned methodNotAllowed = 405;
constexpr unsigned conflict = 409;
constexpr unsigned gone = 410;
constexpr unsigned serverError = 500;

unsigned statusOf(const Error& error) {
    if (error.domain != ErrorDomain::fileProvider) {
        return serverError;
    }
    switch (static_cast<FileProviderErrorCode>(error.code)) {
        case FileProviderErrorCode::noSuchItem:
            return notFound;
        case FileProviderErrorCode::syncAnchorExpired:
            return gone;
        case FileProviderErrorCode::filenameCollision:
            return conflict;
        case FileProviderErrorCode::invalidParameter:
            return badRequest;
    }
    return serverError;
}

ApiAnswer failed(const Error& error) {
    return {.status = statusOf(error), .body = errorJson(error)};
}

ApiAnswer refused(unsigned status, int code, std::string_view what) {
    return {.status = status, .body = errorJson(errorWithPOSIXCode(code, what, {}))};
}

template <typename T, typename Text>
ApiAnswer answerOf(const Expected<T>& result, const Text& text) {
    return result ? ApiAnswer{.body = text(*result)} : failed(result.error());
}

std::string itemsJson(const std::vector<FileProviderItemPtr>& items) {
    return pageJson({.items = items, .nextPage = std::nullopt});
}

// A page or an anchor from the request's query; none for text that is no token.
std::optional<Data> token(const ApiRequest& request, std::string_view name) {
    const auto text = request.parameter(name);
    return text ? base64Decoded(*text) : std::nullopt;
}

std::optional<Data> pageOf(const ApiRequest& request) {
    const auto text = request.parameter("page").value_or("name");
    if (text == "name") {
        return VantrelInitialPageSortedByName();
    }
    if (text == "date") {
        return VantrelInitialPageSortedByDate();
    }
    return token(request, "page");
}

// A stream of signals to one client: holds the watch until the client has gone.
class SignalStream {
  public:
    explicit SignalStream(std::shared_ptr<ApiReply> reply) : reply_(std::move(reply)) {}

    void tell(std::string_view container) {
        reply_->event(container, "signal", textJson("signal", container));
    }
    void hold(std::unique_ptr<LocalRequests::Watch> watch) {
        watch_ = std::move(watch);
        reply_->event("ready", "ready", "{}");
    }

  private:
    std::shared_ptr<ApiReply> reply_;
    std::unique_ptr<LocalRequests::Watch> watch_;
};

// Tells a client how its action gets on. Of progress only the newest is worth sending.
class ToldObserver final : public ActionObserver {
  public:
    explicit ToldObserver(ApiReply& reply) : reply_(reply) {}
    void progressed(const ActionProgress& progress) override {
        const auto now = std::chrono::steady_clock::now();
        const std::lock_guard lock(mutex_);
        if (now < next_) {
            return;
        }
        constexpr std::chrono::milliseconds pause{100};
        next_ = now + pause;
        reply_.event("progress", "progress", progressJson(progress));
    }
    void warned(const std::string& text) override {
        // Each is told; so many of one action that they matter in number are not.
        const std::lock_guard lock(mutex_);
        constexpr int most = 1000;
        if (++warnings_ <= most) {
            reply_.event("warning " + std::to_string(warnings_), "warning",
                         textJson("warning", text));
        }
    }

  private:
    ApiReply& reply_;
    std::mutex mutex_;
    std::chrono::steady_clock::time_point next_;  // guarded by mutex_
    int warnings_ = 0;                            // guarded by mutex_
};

}  // namespace

void Api::handle(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply) {
    if (request.path == std::vector<std::string>{"v1", "signals"} && request.method == "GET") {
        signals(request, reply);
    } else if (request.path == std::vector<std::string>{"v1", "actions"} &&
               request.method == "POST") {
        act(request, reply);
    } else {
        reply->answer(answerTo(request));
    }
}

ApiAnswer Api::answerTo(const ApiRequest& request) {
    const auto& path = request.path;
    if (path.size() < 2 || path[0] != "v1") {
        return refused(notFound, ENOENT, "find that resource");
    }
    if (path[1] == "refresh" && path.size() == 2) {
        return refresh(request);
    }
    if (path[1] == "launches" && path.size() == 2) {
        return launch(request);
    }
    if (request.method != "GET") {
        return refused(methodNotAllowed, ENOTSUP, "do that to this resource");
    }
    if (path[1] == "items" && path.size() >= 3) {
        return itemAnswer(request);
    }
    if (path[1] == "lookup" && path.size() == 2) {
        return lookUp(request);
    }
    if (path[1] == "search" && path.size() == 2) {
        return answerOf(requests_.search(request.parameters("word")), itemsJson);
    }
    if (path[1] == "apps" && path.size() <= 3) {
        return applicationsAnswer(request);
    }
    if (path[1] == "findings" && path.size() == 2) {
        return answerOf(requests_.findings(), findingsJson);
    }
    if (path[1] == "service" && path.size() == 2) {
        return {.body = serviceJson(MARROWDALE_VERSION, static_cast<std::uint64_t>(::getpid()))};
    }
    return refused(notFound, ENOENT, "find that resource");
}

ApiAnswer Api::itemAnswer(const ApiRequest& request) {
    const std::string& identifier = request.path[2];
    const std::string view = request.path.size() == 4 ? request.path[3] : "";
    if (request.path.size() == 3) {
        return answerOf(requests_.item(identifier),
                        [](const FileProviderItemPtr& item) { return itemJson(*item); });
    }
    if (view == "path") {
        return answerOf(requests_.pathOf(identifier),
                        [](const std::string& path) { return textJson("path", path); });
    }
    if (view == "children") {
        return childrenOf(request);
    }
    if (view == "anchor") {
        return answerOf(requests_.anchor(identifier), anchorJson);
    }
    if (view == "changes") {
        return changesOf(request);
    }
    if (view == "thumbnail") {
        return thumbnailOf(identifier);
    }
    return refused(notFound, ENOENT, "find that resource");
}

ApiAnswer Api::childrenOf(const ApiRequest& request) {
    const auto start = pageOf(request);
    if (!start) {
        return failed(errorInvalidParameter("page", request.parameter("page").value_or("")));
    }
    const auto listing = requests_.listing(request.path[2]);
    if (!listing) {
        return failed(listing.error());
    }
    return answerOf((*listing)->page(*start), pageJson);
}

ApiAnswer Api::changesOf(const ApiRequest& request) {
    const auto since = token(request, "since");
    if (!since) {
        return failed(errorInvalidParameter("since", request.parameter("since").value_or("")));
    }
    return answerOf(requests_.changes(request.path[2], *since), changesJson);
}

ApiAnswer Api::lookUp(const ApiRequest& request) {
    const auto path = request.parameter("path");
    if (!path || !path->starts_with('/')) {
        return failed(errorInvalidParameter("path", path.value_or("")));
    }
    return answerOf(requests_.identifierAt(*path), [](const std::string& identifier) {
        return textJson("itemIdentifier", identifier);
    });
}

ApiAnswer Api::thumbnailOf(const std::string& identifier) {
    const auto thumbnails = requests_.thumbnails({identifier});
    if (!thumbnails) {
        return failed(thumbnails.error());
    }
    const auto& data = thumbnails->front().data;
    if (!data) {
        return {.status = noContent, .body = {}};
    }
    return {.body = data->text(), .contentType = "image/png"};
}

ApiAnswer Api::applicationsAnswer(const ApiRequest& request) {
    if (request.path.size() == 2) {
        return answerOf(requests_.appLibraries(), itemsJson);
    }
    return answerOf(requests_.applicationContainer(request.path[2]),
                    [](const FileProviderItemPtr& item) { return itemJson(*item); });
}

ApiAnswer Api::refresh(const ApiRequest& request) {
    if (request.method != "POST") {
        return refused(methodNotAllowed, ENOTSUP, "do that to this resource");
    }
    const auto refreshed = requests_.refreshApplications();
    return refreshed ? ApiAnswer{.body = "{}"} : failed(refreshed.error());
}

void Api::offerBrowser(NewBrowserAddress newAddress) {
    const MutexLock lock(mutex_);
    newBrowserAddress_ = std::move(newAddress);
}

ApiAnswer Api::launch(const ApiRequest& request) {
    if (request.method != "POST") {
        return refused(methodNotAllowed, ENOTSUP, "do that to this resource");
    }
    const MutexLock lock(mutex_);
    if (!newBrowserAddress_) {
        return refused(notFound, ENXIO, "show the document browser, which is not served here");
    }
    return {.body = textJson("address", newBrowserAddress_())};
}

void Api::act(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply) {
    const auto action = actionFromJson(request.body);
    if (!action) {
        reply->answer(failed(action.error()));
        return;
    }
    reply->beginEvents();
    ToldObserver observer(*reply);
    const auto done = requests_.perform(*action, observer, reply->gone());
    if (done) {
        reply->event("end", "done", *done ? itemJson(**done) : "{}");
    } else {
        reply->event("end", "failed", errorJson(done.error()));
    }
    reply->endEvents();
}

void Api::signals(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply) {
    const auto stream = std::make_shared<SignalStream>(reply);
    auto watch = requests_.startWatch(
        request.parameters("container"),
        [stream = stream.get()](std::string_view container) { stream->tell(container); });
    if (!watch) {
        reply->answer(failed(watch.error()));
        return;
    }
    reply->beginEvents();
    stream->hold(std::move(*watch));
    reply->keepUntilGone(stream);
}

}  // namespace marrowdale::host
