#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Data.h"

namespace marrowdale::native {

// Drawn icons on disk, so that each is drawn once. A file for each, named by what it was drawn
// from; a bitmap that is not whole counts as none, and so does a folder that can't be written.
// Any thread, and any number of processes.
class IconCache {
  public:
    // When this is made and there are more files than that, it begins anew.
    static constexpr std::size_t mostFiles = 4096;

    // Made with the folders above it when the first icon is kept; empty for no cache.
    explicit IconCache(std::string folder);

    // `key` says everything that the picture depends on.
    [[nodiscard]] std::optional<Data> find(std::string_view key) const;
    void keep(std::string_view key, const Data& bitmap) const;

  private:
    [[nodiscard]] std::string fileFor(std::string_view key) const;

    const std::string folder_;
};

}  // namespace marrowdale::native
