#include "host/daemon/LocalListing.h"

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

}  // namespace

Expected<ItemPage> LocalListing::page(const Data& page) {
    PageCollector collector;
    enumerator_->enumerateItemsForObserver(collector, page);
    return collector.take();
}

}  // namespace marrowdale::host
