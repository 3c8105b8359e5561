#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Where trashed items came from, to be put back there and to be shown; the provider records it for
// app libraries alone, and tells nobody. On disk, a file an item, named by the item's identifier
// and holding that of its former parent. Any thread.
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
