#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/URL.h"
#include "platform/linux/files/Access.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/services/DirectoryEnumerator.h"

namespace marrowdale::native {

// The folders a walk is in, from its root down. Only the deepest few and the root are open; the
// others are a name and a position, and are opened again from the root when the walk comes back to
// them. A folder is opened by its name in its parent, follows no link, and must be the one that was
// seen, on the root's device and mount. One thread.
class FolderStack {
  public:
    struct Level {
        std::string name;  // empty for the root
        FileID folder{};   // 0: not known yet
        std::int64_t offset = 0;
        std::optional<URL> url;  // made when somebody asks
        std::optional<DirectoryReader> reader;
        Mount mount = Mount::writable;
        bool reportedEntry = false;  // for the walk: an entry that can't be looked at was reported
    };
    // Told of a folder that can't be opened; answers whether to go on without it.
    using ErrorHandler = std::function<bool(const URL&, const Error&)>;

    // How many folders are open at most, the root not counted.
    static constexpr std::size_t openLevels = 32;

    // The trees must outlive the stack.
    FolderStack(const URL& rootURL, UniqueFD root, const EntryStatus& rootStatus,
                const ServedTrees& trees, ErrorHandler handler);

    // Puts the walk where a position says; levels behind the first are opened when needed. ESTALE
    // when the position is not one of this root folder.
    [[nodiscard]] Expected<void> restore(const DirectoryPosition& position);
    [[nodiscard]] DirectoryPosition position() const;
    // After a rest: whether every open folder is as it was when it was last read from, and the root
    // is what stands under its path now. From then on the handler given is told.
    [[nodiscard]] bool takeUp(const EntryStatus& atRootPath, ErrorHandler handler);

    [[nodiscard]] bool empty() const { return levels_.empty(); }
    // Opens the innermost folder, leaving out those that are gone or were replaced meanwhile. Not
    // to be called when empty; the root always stays.
    [[nodiscard]] Expected<void> openTop();
    [[nodiscard]] Level& top() { return levels_.back(); }
    [[nodiscard]] const Level& top() const { return levels_.back(); }
    [[nodiscard]] bool isAtRoot() const { return levels_.size() == 1; }
    [[nodiscard]] const URL& topURL();

    void push(std::string_view name, FileID folder, std::optional<URL> url);
    void pop() { levels_.pop_back(); }

    // The URL the walk began with. Not to be called when empty.
    [[nodiscard]] const URL& rootURL() const { return *levels_.front().url; }
    // What lies on another is no part of the walk.
    [[nodiscard]] DeviceID device() const { return device_; }

  private:
    enum class Opened : std::uint8_t { yes, gone };

    [[nodiscard]] std::size_t nearestOpenAbove(std::size_t index) const;
    [[nodiscard]] std::string pathBetween(std::size_t ancestor, std::size_t index) const;
    [[nodiscard]] Expected<Opened> open(std::size_t ancestor, std::size_t index);
    [[nodiscard]] const URL& urlOf(std::size_t index);

    std::vector<Level> levels_;
    DeviceID device_;
    const ServedTrees& trees_;
    ErrorHandler handler_;
};

}  // namespace marrowdale::native
