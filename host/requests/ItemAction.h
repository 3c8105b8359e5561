#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/ResourceValue.h"

namespace marrowdale::host {

// One action on items, as a value: what a command asks for, and what travels over the socket.
struct ItemAction {
    enum class Kind : std::uint8_t {
        import,    // path, parent
        create,    // name, parent
        rename,    // item, name
        move,      // item, parent, maybe name
        trash,     // item
        untrash,   // item, maybe parent
        remove,    // item
        tag,       // item, tags
        favorite,  // item, maybe rank
        used,      // item, maybe date
        purge,     // date
    };
    Kind kind = Kind::trash;
    std::string item;  // an identifier, as all of these
    std::optional<std::string> parent;
    std::optional<std::string> name;
    std::string path;  // absolute
    std::vector<std::string> tags;
    std::optional<Number> rank;
    std::optional<Date> date;
};

// {"action": KIND, …} with the members that have a value, and the way back. What can't be read is
// invalidParameter, with the member's name.
[[nodiscard]] std::string actionJson(const ItemAction& action);
[[nodiscard]] Expected<ItemAction> actionFromJson(std::string_view text);

// How far an action has got.
struct ActionProgress {
    std::uint64_t entries = 0;
    std::uint64_t bytes = 0;
    std::uint64_t totalBytes = 0;  // 0: not known
};
[[nodiscard]] std::string progressJson(const ActionProgress& progress);
[[nodiscard]] std::optional<ActionProgress> progressFromJson(std::string_view text);

// Hears how an action gets on, on any thread.
class ActionObserver {
  public:
    virtual ~ActionObserver() = default;
    virtual void progressed(const ActionProgress& progress) = 0;
    // Something could not be kept that is no failure: one line for people.
    virtual void warned(const std::string& text) = 0;
};

}  // namespace marrowdale::host
