#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/store/StoreIdentity.h"

namespace marrowdale::native {

// Where the parts of one root folder's store lie in the state folder, and how the store comes and
// goes as a whole. `key` is RootBinding::key.
class StoreFolder {
  public:
    enum class Part : std::uint8_t { store, unfinished };

    StoreFolder(std::string stateFolder, std::string key)
        : state_(std::move(stateFolder)), key_(std::move(key)) {}
    // The key in the name of such a folder; none in any other name.
    [[nodiscard]] static std::optional<std::string> keyIn(std::string_view name, Part part);

    [[nodiscard]] const std::string& state() const { return state_; }
    [[nodiscard]] std::string store() const { return state_ + "/store-" + key_; }
    [[nodiscard]] std::string damaged() const { return state_ + "/damaged-" + key_; }
    [[nodiscard]] std::string identity() const { return store() + "/identity"; }
    [[nodiscard]] std::string identifiers() const { return store() + "/identifiers"; }
    [[nodiscard]] std::string head() const { return store() + "/head"; }
    [[nodiscard]] std::string snapshot() const { return store() + "/snapshot"; }
    [[nodiscard]] std::string segment(std::uint64_t number) const;
    // In the cache folder; of its own for each place of a state folder. The store that is made in
    // place of an earlier one takes its witness over.
    [[nodiscard]] std::string witness(const std::string& cacheFolder) const;

    [[nodiscard]] bool hasStore() const;
    // The numbers of the segments that are there, sorted.
    [[nodiscard]] Expected<std::vector<std::uint64_t>> segments() const;

    // Removes what an end in the middle of making something left.
    [[nodiscard]] Expected<void> sweep() const;
    // Makes a whole, empty store; there must be none.
    [[nodiscard]] Expected<void> create(const StoreIdentity& identity) const;
    // Replaces the identity of the store that is there.
    [[nodiscard]] Expected<void> rewrite(const StoreIdentity& identity) const;
    // Makes room for a new store and keeps this one, in place of what was set aside before.
    [[nodiscard]] Expected<void> setAside() const;

  private:
    [[nodiscard]] std::string unfinished() const { return store() + ".new"; }
    std::string state_;
    std::string key_;
};

}  // namespace marrowdale::native
