#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <unordered_map>
#include <utility>

#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// A watched folder or file.
struct Watched {
    enum class Role : std::uint8_t { folder, root, file };

    FileID number{};
    Role role = Role::folder;
};

// Which of the kernel's keys (a handle, the number of a watch) stands for which watched folder or
// file. Whole keys are compared; handles hold the generation of an inode number, so a folder that
// has the number of one that is gone is never taken for it. One thread at a time.
template <typename Key>
class WatchTable {
  public:
    using View = std::conditional_t<std::is_same_v<Key, std::string>, std::string_view, Key>;

    // An earlier key of that number, and an earlier number of that key, are forgotten. A root stays
    // one when it comes again as a folder. Answers the key that the number had, if it had another.
    std::optional<Key> watch(FileID number, View view, Watched::Role role) {
        Key key(view);  // the view may lie in what is about to be forgotten
        const auto known = find(key);
        if (known && known->number == number && known->role == Watched::Role::root &&
            role == Watched::Role::folder) {
            role = Watched::Role::root;
        }
        forget(key);
        std::optional<Key> earlier = unwatch(number);
        const auto added = byKey_.emplace(std::move(key), Watched{number, role}).first;
        byNumber_[number] = &added->first;
        return earlier;
    }

    // Forgets the number and answers the key that it had.
    std::optional<Key> unwatch(FileID number) {
        const auto found = byNumber_.find(number);
        if (found == byNumber_.end()) {
            return std::nullopt;
        }
        auto node = byKey_.extract(byKey_.find(*found->second));
        byNumber_.erase(found);
        return std::move(node.key());
    }

    // Forgets what has that key.
    void forget(View key) {
        const auto found = byKey_.find(key);
        if (found != byKey_.end()) {
            byNumber_.erase(found->second.number);
            byKey_.erase(found);
        }
    }

    [[nodiscard]] std::optional<Watched> find(View key) const {
        const auto found = byKey_.find(key);
        return found == byKey_.end() ? std::nullopt : std::optional(found->second);
    }

    [[nodiscard]] std::size_t size() const { return byKey_.size(); }

  private:
    struct Hash {
        using is_transparent = void;
        std::size_t operator()(View key) const { return std::hash<View>()(key); }
    };

    std::unordered_map<Key, Watched, Hash, std::equal_to<>> byKey_;
    std::unordered_map<FileID, const Key*> byNumber_;  // the keys of byKey_, where they lie
};

}  // namespace marrowdale::native
