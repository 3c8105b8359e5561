#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Where trashed items of the user's own documents came from: the provider records that for app
// libraries alone. On disk, a file an item, named by the item's identifier and holding that of its
// former parent. Any thread.
class PutBackParents {
  public:
    // `folder` is made when it is needed.
    explicit PutBackParents(std::string folder) : folder_(std::move(folder)) {}

    // Durable when it returns.
    [[nodiscard]] Expected<void> remember(std::string_view item, std::string_view parent) const;
    [[nodiscard]] std::optional<std::string> parentOf(std::string_view item) const;
    void forget(std::string_view item) const;
    // Those that something is remembered of.
    [[nodiscard]] std::vector<std::string> items() const;

  private:
    [[nodiscard]] std::string fileOf(std::string_view item) const {
        return folder_ + "/" + std::string(item);
    }
    std::string folder_;
};

}  // namespace marrowdale::host
