#include "client/include/marrowdale/client.h"

#include <cstdlib>

#include "host/client/RemoteRequests.h"
#include "host/requests/ErrorDescription.h"
#include "host/requests/TagNames.h"
#include "platform/foundation/Base64.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::client {

namespace {

std::unexpected<Error> failed(const marrowdale::Error& error) {
    host::ErrorDescription description = host::described(error);
    return std::unexpected(Error{std::move(description.domain), description.code,
                                 std::move(description.name), std::move(description.message)});
}

std::optional<Time> timeOf(const std::optional<Date>& date) {
    return date ? std::optional(Time{date->seconds, date->nanoseconds}) : std::nullopt;
}

std::optional<double> rankOf(const std::optional<Number>& rank) {
    if (!rank) {
        return std::nullopt;
    }
    return std::visit([](auto value) { return static_cast<double>(value); }, *rank);
}

Item itemOf(const FileProviderItem& item) {
    Item result{.itemIdentifier = item.itemIdentifier,
                .parentItemIdentifier = item.parentItemIdentifier,
                .filename = item.filename,
                .typeIdentifier = item.typeIdentifier,
                .documentSize = item.documentSize,
                .creationDate = timeOf(item.creationDate),
                .contentModificationDate = timeOf(item.contentModificationDate),
                .childItemCount = item.childItemCount,
                .capabilities = item.capabilities,
                .versionIdentifier = {},
                .isTrashed = item.isTrashed,
                .lastUsedDate = timeOf(item.lastUsedDate),
                .tags = host::tagNames(item),
                .favoriteRank = rankOf(item.favoriteRank),
                .fileID = item.fileID,
                .docID = item.docID,
                .path = item.fileURL.path(),
                .isFolder = item.isFolder(),
                .isContainer = item.hx_isContainer(),
                .appContainerBundleIdentifier = item.hx_appContainerBundleIdentifier};
    if (item.versionIdentifier) {
        result.versionIdentifier = base64Encoded(item.versionIdentifier->bytes());
    }
    return result;
}

std::vector<Item> itemsOf(const std::vector<FileProviderItemPtr>& items) {
    std::vector<Item> result;
    result.reserve(items.size());
    for (const auto& item : items) {
        result.push_back(itemOf(*item));
    }
    return result;
}

std::optional<std::string> textOf(const std::optional<Data>& token) {
    return token ? std::optional(base64Encoded(token->bytes())) : std::nullopt;
}

std::string environmentVariable(const char* name) {
    const char* const value = std::getenv(name);  // NOLINT(concurrency-mt-unsafe)
    return value != nullptr ? value : "";
}

}  // namespace

class Service::Connection {
  public:
    explicit Connection(std::unique_ptr<host::RemoteRequests> requests)
        : requests_(std::move(requests)) {}
    [[nodiscard]] host::RemoteRequests& requests() { return *requests_; }

  private:
    std::unique_ptr<host::RemoteRequests> requests_;
};

Service::Service(std::unique_ptr<Connection> connection) : connection_(std::move(connection)) {}
Service::Service(Service&& other) noexcept = default;
Service& Service::operator=(Service&& other) noexcept = default;
Service::~Service() = default;

std::string Service::defaultStateFolder() {
    if (std::string state = environmentVariable("MARROWDALE_STATE"); !state.empty()) {
        return state;
    }
    if (const std::string state = environmentVariable("XDG_STATE_HOME"); state.starts_with('/')) {
        return state + "/marrowdale";
    }
    const std::string home = environmentVariable("HOME");
    return home.empty() ? home : home + "/.local/state/marrowdale";
}

Result<Service> Service::connect(const std::string& stateFolder) {
    auto requests = host::RemoteRequests::connect(stateFolder);
    if (!requests) {
        return failed(requests.error());
    }
    return Service(std::make_unique<Connection>(std::move(*requests)));
}

Result<Item> Service::item(std::string_view identifier) {
    const auto item = connection_->requests().item(identifier);
    return item ? Result<Item>(itemOf(**item)) : failed(item.error());
}

Result<std::string> Service::identifierAt(std::string_view path) {
    auto identifier = connection_->requests().identifierAt(path);
    return identifier ? Result<std::string>(std::move(*identifier)) : failed(identifier.error());
}

Result<std::string> Service::pathOf(std::string_view identifier) {
    auto path = connection_->requests().pathOf(identifier);
    return path ? Result<std::string>(std::move(*path)) : failed(path.error());
}

Result<Page> Service::page(std::string_view container, const std::optional<std::string>& page) {
    auto token = page ? base64Decoded(*page) : VantrelInitialPageSortedByName();
    if (!token) {
        return failed(errorInvalidParameter("page", *page));
    }
    const auto listing = connection_->requests().listing(container);
    if (!listing) {
        return failed(listing.error());
    }
    const auto answer = (*listing)->page(*token);
    if (!answer) {
        return failed(answer.error());
    }
    return Page{itemsOf(answer->items), textOf(answer->nextPage)};
}

Result<std::string> Service::anchor(std::string_view container) {
    const auto anchor = connection_->requests().anchor(container);
    if (!anchor) {
        return failed(anchor.error());
    }
    const auto text = textOf(*anchor);
    return text ? Result<std::string>(*text)
                : failed(errorInvalidParameter("container", container));
}

Result<Changes> Service::changes(std::string_view container, std::string_view since) {
    const auto token = base64Decoded(since);
    if (!token) {
        return failed(errorInvalidParameter("since", since));
    }
    const auto changes = connection_->requests().changes(container, *token);
    if (!changes) {
        return failed(changes.error());
    }
    return Changes{itemsOf(changes->updated), changes->deleted,
                   base64Encoded(changes->anchor.bytes()), changes->moreComing == MoreComing::yes};
}

Result<void> Service::watch(const std::vector<std::string>& containers,
                            const std::function<void()>& ready,
                            const std::function<void(std::string_view)>& signal,
                            std::stop_token stop) {
    const auto ended = connection_->requests().watch(containers, ready, signal, std::move(stop));
    return ended ? Result<void>() : failed(ended.error());
}

Result<std::vector<Item>> Service::search(const std::vector<std::string>& words) {
    const auto found = connection_->requests().search(words);
    return found ? Result<std::vector<Item>>(itemsOf(*found)) : failed(found.error());
}

Result<std::vector<Item>> Service::applications() {
    const auto libraries = connection_->requests().appLibraries();
    return libraries ? Result<std::vector<Item>>(itemsOf(*libraries)) : failed(libraries.error());
}

Result<Item> Service::application(std::string_view bundleIdentifier) {
    const auto library = connection_->requests().applicationContainer(bundleIdentifier);
    return library ? Result<Item>(itemOf(**library)) : failed(library.error());
}

Result<void> Service::refreshApplications() {
    const auto refreshed = connection_->requests().refreshApplications();
    return refreshed ? Result<void>() : failed(refreshed.error());
}

Result<std::optional<std::string>> Service::thumbnail(std::string_view identifier) {
    const auto thumbnails = connection_->requests().thumbnails({std::string(identifier)});
    if (!thumbnails) {
        return failed(thumbnails.error());
    }
    const auto& picture = thumbnails->front().data;
    return picture ? std::optional(picture->text()) : std::nullopt;
}

}  // namespace marrowdale::client
