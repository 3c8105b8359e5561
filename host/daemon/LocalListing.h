#pragma once

#include <memory>

#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// A listing by one enumerator of the extension's, which is told when it is over.
class LocalListing final : public ItemListing {
  public:
    explicit LocalListing(std::unique_ptr<FileProviderEnumerator> enumerator)
        : enumerator_(std::move(enumerator)) {}
    LocalListing(const LocalListing&) = delete;
    LocalListing& operator=(const LocalListing&) = delete;
    ~LocalListing() override { enumerator_->invalidate(); }

    [[nodiscard]] Expected<ItemPage> page(const Data& page) override;

  private:
    std::unique_ptr<FileProviderEnumerator> enumerator_;
};

}  // namespace marrowdale::host
