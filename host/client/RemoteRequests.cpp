#include "host/client/RemoteRequests.h"

#include <cerrno>
#include <optional>

#include "host/requests/ErrorJson.h"
#include "host/requests/FeedJson.h"
#include "platform/foundation/Base64.h"
#include "platform/foundation/PercentEncoding.h"

namespace marrowdale::host {

namespace {

constexpr unsigned statusOK = 200;
constexpr unsigned statusNoContent = 204;

std::string encoded(std::string_view text) {
    std::string result = percentEncodedPath(text);
    for (std::size_t at = 0; (at = result.find('/', at)) != std::string::npos;) {
        result.replace(at, 1, "%2F");
    }
    return result;
}

std::string itemTarget(std::string_view identifier, std::string_view rest = {}) {
    return "/v1/items/" + encoded(identifier) + std::string(rest);
}

std::string tokenText(const Data& token) {
    return encoded(base64Encoded(token.bytes()));
}

Expected<std::string> bodyOf(Expected<HttpAnswer> answer) {
    if (!answer) {
        return Unexpected(answer.error());
    }
    if (answer->status != statusOK) {
        return Unexpected(errorFromJson(answer->body));
    }
    return std::move(answer->body);
}

}  // namespace

class RemoteRequests::Listing final : public ItemListing {
  public:
    Listing(RemoteRequests& requests, std::string_view container)
        : requests_(requests), target_(itemTarget(container, "/children?page=")) {}

    [[nodiscard]] Expected<ItemPage> page(const Data& page) override {
        const auto body = requests_.get(target_ + tokenText(page));
        return body ? pageFromJson(*body) : Unexpected(body.error());
    }

  private:
    RemoteRequests& requests_;
    std::string target_;
};

Expected<std::unique_ptr<RemoteRequests>> RemoteRequests::connect(const std::string& stateFolder) {
    auto connection = HttpConnection::open(stateFolder);
    if (!connection) {
        return Unexpected(connection.error());
    }
    std::unique_ptr<RemoteRequests> requests(
        new RemoteRequests(stateFolder, std::move(*connection)));
    const auto service = requests->get("/v1/service");
    if (!service) {
        return Unexpected(service.error());
    }
    const auto processID = processIDFromJson(*service);
    if (!processID) {
        return Unexpected(processID.error());
    }
    requests->processID_ = *processID;
    return requests;
}

Expected<std::string> RemoteRequests::get(std::string target) {
    const std::lock_guard lock(mutex_);
    return bodyOf(connection_->send({.target = std::move(target)}));
}

Expected<FileProviderItemPtr> RemoteRequests::item(std::string_view identifier) {
    const auto body = get(itemTarget(identifier));
    return body ? itemFromJson(*body) : Unexpected(body.error());
}

Expected<std::string> RemoteRequests::identifierAt(std::string_view path) {
    const auto body = get("/v1/lookup?path=" + encoded(path));
    return body ? textFromJson("itemIdentifier", *body) : Unexpected(body.error());
}

Expected<std::string> RemoteRequests::pathOf(std::string_view identifier) {
    const auto body = get(itemTarget(identifier, "/path"));
    return body ? textFromJson("path", *body) : Unexpected(body.error());
}

Expected<std::unique_ptr<ItemListing>> RemoteRequests::listing(std::string_view container) {
    return std::unique_ptr<ItemListing>(std::make_unique<Listing>(*this, container));
}

Expected<std::optional<Data>> RemoteRequests::anchor(std::string_view container) {
    const auto body = get(itemTarget(container, "/anchor"));
    return body ? anchorFromJson(*body) : Unexpected(body.error());
}

Expected<ItemChanges> RemoteRequests::changes(std::string_view container, const Data& since) {
    const auto body = get(itemTarget(container, "/changes?since=") + tokenText(since));
    return body ? changesFromJson(*body) : Unexpected(body.error());
}

Expected<void> RemoteRequests::watch(const std::vector<std::string>& containers,
                                     const std::function<void()>& ready, const SignalTaker& taker,
                                     std::stop_token stop) {
    auto connection = HttpConnection::open(stateFolder_);
    if (!connection) {
        return Unexpected(connection.error());
    }
    std::string target = "/v1/signals";
    for (const std::string& container : containers) {
        target += (target.contains('?') ? "&container=" : "?container=") + encoded(container);
    }
    const EventTaker events = [&](std::string_view name, std::string_view data) {
        if (name == "ready") {
            ready();
        } else if (const auto container = textFromJson("signal", data)) {
            taker(*container);
        }
    };
    auto answer = (*connection)->follow({.target = target}, events, stop);
    if (stop.stop_requested()) {
        return {};
    }
    if (answer && answer->status == statusOK) {
        return Unexpected(errorWithPOSIXCode(ECONNRESET, "talk to the service", {}));
    }
    return Unexpected(bodyOf(std::move(answer)).error());
}

Expected<std::vector<FileProviderItemPtr>> RemoteRequests::search(
    const std::vector<std::string>& words) {
    std::string target = "/v1/search";
    for (const std::string& word : words) {
        target += (target.contains('?') ? "&word=" : "?word=") + encoded(word);
    }
    return itemsAt(std::move(target));
}

Expected<std::vector<FileProviderItemPtr>> RemoteRequests::itemsAt(std::string target) {
    const auto body = get(std::move(target));
    auto page = body ? pageFromJson(*body) : Unexpected(body.error());
    if (!page) {
        return Unexpected(page.error());
    }
    return std::move(page->items);
}

Expected<std::vector<FileProviderItemPtr>> RemoteRequests::appLibraries() {
    return itemsAt("/v1/apps");
}

Expected<FileProviderItemPtr> RemoteRequests::applicationContainer(
    std::string_view bundleIdentifier) {
    const auto body = get("/v1/apps/" + encoded(bundleIdentifier));
    return body ? itemFromJson(*body) : Unexpected(body.error());
}

Expected<void> RemoteRequests::refreshApplications() {
    const std::lock_guard lock(mutex_);
    const auto body = bodyOf(connection_->send({.method = "POST", .target = "/v1/refresh"}));
    return body ? Expected<void>() : Unexpected(body.error());
}

Expected<std::string> RemoteRequests::newBrowserAddress() {
    const std::lock_guard lock(mutex_);
    const auto body =
        bodyOf(connection_->send({.method = "POST", .target = "/v1/launches", .body = "{}"}));
    return body ? textFromJson("address", *body) : Unexpected(body.error());
}

Expected<std::vector<Thumbnail>> RemoteRequests::thumbnails(
    const std::vector<std::string>& identifiers) {
    std::vector<Thumbnail> thumbnails;
    for (const std::string& identifier : identifiers) {
        auto data = thumbnail(identifier);
        if (!data) {
            return Unexpected(data.error());
        }
        thumbnails.push_back({identifier, std::move(*data)});
    }
    return thumbnails;
}

Expected<std::optional<Data>> RemoteRequests::thumbnail(std::string_view identifier) {
    const std::lock_guard lock(mutex_);
    auto answer = connection_->send({.target = itemTarget(identifier, "/thumbnail")});
    if (answer && answer->status == statusNoContent) {
        return std::nullopt;
    }
    const auto picture = bodyOf(std::move(answer));
    if (!picture) {
        return Unexpected(picture.error());
    }
    return Data::fromText(*picture);
}

Expected<FileProviderItemPtr> RemoteRequests::perform(const ItemAction& action,
                                                      ActionObserver& observer,
                                                      const std::stop_token& stop) {
    auto connection = HttpConnection::open(stateFolder_);
    if (!connection) {
        return Unexpected(connection.error());
    }
    std::optional<Expected<FileProviderItemPtr>> result;
    const EventTaker events = [&](std::string_view name, std::string_view data) {
        if (name == "progress") {
            if (const auto progress = progressFromJson(data)) {
                observer.progressed(*progress);
            }
        } else if (name == "warning") {
            observer.warned(textFromJson("warning", data).value_or(std::string(data)));
        } else if (name == "failed") {
            result = Unexpected(errorFromJson(data));
        } else if (name == "done") {
            result = data == "{}" ? Expected<FileProviderItemPtr>(nullptr) : itemFromJson(data);
        }
    };
    auto answer =
        (*connection)
            ->follow({.method = "POST", .target = "/v1/actions", .body = actionJson(action)},
                     events, stop);
    if (result) {
        return std::move(*result);
    }
    if (stop.stop_requested()) {
        return Unexpected(errorWithPOSIXCode(ECANCELED));
    }
    if (answer && answer->status == statusOK) {
        return Unexpected(errorWithPOSIXCode(ECONNRESET, "talk to the service", {}));
    }
    return Unexpected(bodyOf(std::move(answer)).error());
}

Expected<std::vector<Finding>> RemoteRequests::findings() {
    const auto body = get("/v1/findings");
    return body ? findingsFromJson(*body) : Unexpected(body.error());
}

}  // namespace marrowdale::host
