#pragma once

#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/store/StoreFolder.h"
#include "platform/linux/store/StoreIdentity.h"
#include "platform/linux/store/StoreReport.h"

namespace marrowdale::native {

// The state folder: one lock, and the stores of as many root folders as there were, side by side.
// One thread; the lock is held by the caller, but for `stores`.
class StateFolder {
  public:
    explicit StateFolder(std::string path) : path_(std::move(path)) {}

    [[nodiscard]] const std::string& path() const { return path_; }
    [[nodiscard]] std::string lock() const { return path_ + "/lock"; }

    // Where the store of that root folder lies, wherever the folder stood when it was made; or
    // where it is to be made. A store whose identity can't be read is found by its name only.
    // Errors: the state folder can't be read.
    [[nodiscard]] Expected<StoreFolder> storeOf(const RootBinding& root) const;
    // Why the store is made, where an earlier one of that root folder, or of another folder at its
    // path, is in the way of its being the first; else empty.
    [[nodiscard]] std::string reasonToMake(const StoreFolder& folder,
                                           const RootBinding& root) const;

    // Removes what an end in the middle of making a store left.
    [[nodiscard]] Expected<void> sweep() const;

    // Each store that lies there, sorted by name; without those that can't be read just now.
    [[nodiscard]] std::vector<StoredRoot> stores() const;

  private:
    [[nodiscard]] Expected<std::vector<StoreFolder>> storeFolders() const;
    std::string path_;
};

}  // namespace marrowdale::native
