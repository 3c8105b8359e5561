#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// The parameter that an item to list is, as an error names it.
inline constexpr std::string_view listedItemParameter = "ITEM";

// One page of a listing.
struct ItemPage {
    std::vector<FileProviderItemPtr> items;
    std::optional<Data> nextPage;  // none at the end
};

// A listing that goes on page by page; the enumerator is told when it is over.
class Listing {
  public:
    explicit Listing(std::unique_ptr<FileProviderEnumerator> enumerator)
        : enumerator_(std::move(enumerator)) {}
    Listing(Listing&& other) noexcept = default;
    Listing& operator=(Listing&&) = delete;
    Listing(const Listing&) = delete;
    Listing& operator=(const Listing&) = delete;
    ~Listing();

    // One request for one page.
    [[nodiscard]] Expected<ItemPage> page(const Data& page);

  private:
    std::unique_ptr<FileProviderEnumerator> enumerator_;
};

// A host's requests to its extension, one method each. Where the extension answers no value, the
// request fails with the framework's error for an item that does not exist. Any thread.
class ItemRequests {
  public:
    // The extension must outlive the requests and the listings made by them.
    explicit ItemRequests(FileProviderExtension& extension) : extension_(extension) {}

    [[nodiscard]] Expected<FileProviderItemPtr> item(std::string_view identifier) const;
    [[nodiscard]] Expected<std::string> identifierAt(const URL& url) const;
    [[nodiscard]] Expected<URL> urlOf(std::string_view identifier) const;

    // A fresh enumerator over a container. An item that is not a folder is refused
    // (invalidParameter, listedItemParameter), for it has nothing to list.
    [[nodiscard]] Expected<Listing> listing(std::string_view container) const;

  private:
    FileProviderExtension& extension_;
};

}  // namespace marrowdale::host
