#include "host/daemon/ItemRequests.h"

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

class PageCollector final : public FileProviderEnumerationObserver {
  public:
    void didEnumerateItems(std::vector<FileProviderItemPtr> items) override {
        if (page_.items.empty()) {
            page_.items = std::move(items);
        } else {
            page_.items.insert(page_.items.end(), items.begin(), items.end());
        }
    }
    void finishEnumeratingUpToPage(std::optional<Data> nextPage) override {
        page_.nextPage = std::move(nextPage);
    }
    void finishEnumeratingWithError(const Error& error) override { error_ = error; }

    [[nodiscard]] Expected<ItemPage> take() {
        if (error_) {
            return Unexpected(*error_);
        }
        return std::move(page_);
    }

  private:
    ItemPage page_;
    std::optional<Error> error_;
};

bool isSystemContainer(std::string_view identifier) {
    return identifier == VantrelRootContainerItemIdentifier ||
           identifier == VantrelWorkingSetContainerItemIdentifier ||
           identifier == VantrelAllDirectoriesContainerItemIdentifier;
}

Error errorNotAFolder(std::string_view identifier) {
    return {ErrorDomain::fileProvider, static_cast<int>(FileProviderErrorCode::invalidParameter),
            std::string(listedItemParameter), std::string(identifier)};
}

}  // namespace

Listing::~Listing() {
    if (enumerator_) {
        enumerator_->invalidate();
    }
}

Expected<ItemPage> Listing::page(const Data& page) {
    PageCollector collector;
    enumerator_->enumerateItemsForObserver(collector, page);
    return collector.take();
}

Expected<FileProviderItemPtr> ItemRequests::item(std::string_view identifier) const {
    return extension_.itemForIdentifier(identifier);
}

Expected<std::string> ItemRequests::identifierAt(const URL& url) const {
    auto identifier = extension_.persistentIdentifierForItemAtURL(url);
    if (!identifier) {
        return Unexpected(errorForNonExistentItem(url.path()));
    }
    return std::move(*identifier);
}

Expected<URL> ItemRequests::urlOf(std::string_view identifier) const {
    auto url = extension_.URLForItemWithPersistentIdentifier(identifier);
    if (!url) {
        return Unexpected(errorForNonExistentItem(identifier));
    }
    return std::move(*url);
}

Expected<Listing> ItemRequests::listing(std::string_view container) const {
    if (!isSystemContainer(container)) {
        const auto folder = item(container);
        if (!folder) {
            return Unexpected(folder.error());
        }
        if (!(*folder)->isFolder() && !(*folder)->hx_isContainer()) {
            return Unexpected(errorNotAFolder(container));
        }
    }
    auto enumerator = extension_.enumeratorForContainerItemIdentifier(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    return Listing(std::move(*enumerator));
}

}  // namespace marrowdale::host
