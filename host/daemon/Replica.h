#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/daemon/Database.h"
#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Items that have something in common, wherever they are.
struct ItemCollection {
    enum class Kind : std::uint8_t {
        favorites,
        recents,  // those with a last-used date, the latest first
        tagged,   // with exactly this tag
    };
    Kind kind = Kind::favorites;
    std::string tag = {};
};

struct TagCount {
    std::string tag;
    std::uint64_t items = 0;

    friend bool operator==(const TagCount&, const TagCount&) = default;
};

// The items that the host was told of, on disk, with the anchor up to which they are told; names
// and tags are searchable. Everything in it can be made again by listing. One thread at a time.
class Replica {
  public:
    // Opens the file, or makes it anew where it is missing, damaged or of another version. Errors:
    // it can't be made either.
    [[nodiscard]] static Expected<Replica> open(const std::string& path);

    // The anchor up to which the items are complete; none before the first listing.
    [[nodiscard]] Expected<std::optional<Data>> anchor();

    // Forgets everything.
    [[nodiscard]] Expected<void> clear();
    // Takes items of a listing.
    [[nodiscard]] Expected<void> add(std::span<const FileProviderItemPtr> items);
    // Applies changes, deletions first, and remembers their anchor, all or nothing.
    [[nodiscard]] Expected<void> apply(const ItemChanges& changes);
    // Says that the items are complete up to that anchor.
    [[nodiscard]] Expected<void> setAnchor(const Data& anchor);

    // Removes the items that carry these bundle identifiers, written as "#" and the identifier.
    [[nodiscard]] Expected<void> removeDomains(std::span<const std::string> domains);

    // The items whose name or a tag of theirs contains every word, without regard to case, at most
    // `limit` of them, in the order of their names.
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> search(
        std::span<const std::string> words, std::int64_t limit);

    // The items that belong to a collection, at most `limit` of them.
    [[nodiscard]] Expected<std::vector<FileProviderItemPtr>> collection(
        const ItemCollection& collection, std::int64_t limit);
    // Every tag, and how many items have it, in the order of the tags' bytes.
    [[nodiscard]] Expected<std::vector<TagCount>> tags();

    [[nodiscard]] Expected<std::uint64_t> count();

  private:
    explicit Replica(Database database) : database_(std::move(database)) {}

    template <typename Work>
    Expected<void> inTransaction(const Work& work);
    [[nodiscard]] Expected<void> put(const FileProviderItem& item);
    [[nodiscard]] Expected<void> remove(std::string_view identifier);
    [[nodiscard]] Expected<void> removeTree(std::string_view identifier);
    [[nodiscard]] Expected<void> removeWhere(const std::string& condition, std::string_view value);
    [[nodiscard]] Expected<void> writeAnchor(const Data& anchor);
    [[nodiscard]] static Expected<std::vector<FileProviderItemPtr>> itemsOf(
        Expected<Statement> statement);

    Database database_;
};

}  // namespace marrowdale::host
