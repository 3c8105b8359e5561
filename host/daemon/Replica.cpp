#include "host/daemon/Replica.h"

#include <charconv>
#include <filesystem>
#include <map>
#include <ranges>
#include <system_error>

#include "host/requests/FeedJson.h"
#include "host/requests/TagNames.h"
#include "platform/foundation/Base64.h"

namespace marrowdale::host {

namespace {

constexpr std::int64_t formatVersion = 3;

// The index holds three letters of every name and tag at each place, so that any part of three
// letters or more is found without reading all names.
constexpr const char* tables = R"(
CREATE TABLE items (
    number INTEGER PRIMARY KEY, identifier TEXT UNIQUE NOT NULL, parent TEXT NOT NULL,
    file INTEGER, domain TEXT,
    name TEXT NOT NULL, tags TEXT NOT NULL, favorite INTEGER, used TEXT, item TEXT NOT NULL);
CREATE INDEX items_by_parent ON items (parent);
CREATE INDEX items_by_file ON items (file);
CREATE INDEX items_by_domain ON items (domain) WHERE domain IS NOT NULL;
CREATE INDEX items_by_favorite ON items (favorite) WHERE favorite IS NOT NULL;
CREATE INDEX items_by_used ON items (used) WHERE used IS NOT NULL;
CREATE INDEX items_by_tags ON items (tags) WHERE tags <> '';
CREATE VIRTUAL TABLE names USING fts5(name, tags, content='items', content_rowid='number',
                                      tokenize='trigram');
CREATE TRIGGER items_added AFTER INSERT ON items BEGIN
    INSERT INTO names(rowid, name, tags) VALUES (new.number, new.name, new.tags);
END;
CREATE TRIGGER items_removed AFTER DELETE ON items BEGIN
    INSERT INTO names(names, rowid, name, tags) VALUES ('delete', old.number, old.name, old.tags);
END;
CREATE TABLE state (anchor TEXT);
PRAGMA user_version=3;
)";

constexpr std::size_t shortestIndexed = 3;

std::optional<std::int64_t> fileNumber(std::string_view identifier) {
    constexpr std::string_view prefix = "fid=";
    if (!identifier.starts_with(prefix)) {
        return std::nullopt;
    }
    std::uint64_t number = 0;
    const char* const end = identifier.data() + identifier.size();
    const auto parsed = std::from_chars(identifier.data() + prefix.size(), end, number);
    return parsed.ptr == end && parsed.ec == std::errc()
               ? std::optional(static_cast<std::int64_t>(number))
               : std::nullopt;
}

std::string joinedTags(const FileProviderItem& item) {
    std::string joined;
    for (const std::string& tag : tagNames(item)) {
        joined += tag + "\n";
    }
    return joined;
}

// A word as the index's query language has it: in quotes, which are doubled within.
std::string inQuotes(std::string_view word) {
    std::string text = "\"";
    for (const char character : word) {
        text += character;
        if (character == '"') {
            text += character;
        }
    }
    return text + "\"";
}

// The number of characters of UTF-8.
std::size_t characterCount(std::string_view text) {
    std::size_t count = 0;
    for (const char byte : text) {
        count += (static_cast<unsigned char>(byte) & 0xC0U) != 0x80U ? 1 : 0;
    }
    return count;
}

bool isIndexed(std::string_view word) {
    return characterCount(word) >= shortestIndexed;
}

// A statement that finds the items with all words: the long ones by the index, the others by
// looking at what is left.
std::string searchStatement(std::span<const std::string> words) {
    std::string match;
    std::string rest;
    for (const std::string& word : words) {
        if (isIndexed(word)) {
            match += (match.empty() ? "" : " AND ") + inQuotes(word);
        } else {
            rest += " AND (instr(lower(name), lower(?)) OR instr(lower(tags), lower(?)))";
        }
    }
    std::string text = "SELECT item FROM items WHERE 1";
    if (!match.empty()) {
        text += " AND number IN (SELECT rowid FROM names WHERE names MATCH ?)";
    }
    return text + rest + " ORDER BY name LIMIT ?";
}

std::string matchOf(std::span<const std::string> words) {
    std::string match;
    for (const std::string& word : words) {
        if (isIndexed(word)) {
            match += (match.empty() ? "" : " AND ") + inQuotes(word);
        }
    }
    return match;
}

Expected<std::int64_t> versionOf(Database& database) {
    auto statement = database.prepare("PRAGMA user_version");
    if (!statement) {
        return Unexpected(statement.error());
    }
    const auto hasRow = statement->step();
    if (!hasRow) {
        return Unexpected(hasRow.error());
    }
    return statement->number(0);
}

Expected<Database> openOfThisVersion(const std::string& path) {
    auto database = Database::open(path);
    if (!database) {
        return database;
    }
    const auto version = versionOf(*database);
    if (version && *version == formatVersion) {
        return database;
    }
    return Unexpected(errorWithPOSIXCode(EUCLEAN, "use the search index", path));
}

void removeFiles(const std::string& path) {
    std::error_code ignored;
    std::filesystem::remove(path, ignored);
    std::filesystem::remove(path + "-wal", ignored);
}

}  // namespace

Expected<Replica> Replica::open(const std::string& path) {
    if (auto database = openOfThisVersion(path)) {
        return Replica(std::move(*database));
    }
    removeFiles(path);
    auto database = Database::open(path);
    if (!database) {
        return Unexpected(database.error());
    }
    if (auto made = database->run(tables); !made) {
        return Unexpected(made.error());
    }
    return Replica(std::move(*database));
}

template <typename Work>
Expected<void> Replica::inTransaction(const Work& work) {
    if (auto begun = database_.run("BEGIN"); !begun) {
        return begun;
    }
    Expected<void> result = work();
    if (result) {
        result = database_.run("COMMIT");
    }
    if (!result) {
        // A transaction that the library has taken back itself is none to take back.
        [[maybe_unused]] const auto undone = database_.run("ROLLBACK");
    }
    return result;
}

Expected<std::optional<Data>> Replica::anchor() {
    auto statement = database_.prepare("SELECT anchor FROM state");
    if (!statement) {
        return Unexpected(statement.error());
    }
    const auto hasRow = statement->step();
    if (!hasRow) {
        return Unexpected(hasRow.error());
    }
    return *hasRow ? base64Decoded(statement->text(0)) : std::nullopt;
}

Expected<void> Replica::clear() {
    return database_.run("BEGIN; DELETE FROM state; DELETE FROM items; COMMIT;");
}

Expected<void> Replica::writeAnchor(const Data& anchor) {
    if (auto cleared = database_.run("DELETE FROM state"); !cleared) {
        return cleared;
    }
    auto statement = database_.prepare("INSERT INTO state (anchor) VALUES (?)");
    return statement ? statement->bind(1, base64Encoded(anchor.bytes())).run()
                     : Unexpected(statement.error());
}

Expected<void> Replica::setAnchor(const Data& anchor) {
    return inTransaction([&] { return writeAnchor(anchor); });
}

Expected<void> Replica::put(const FileProviderItem& item) {
    if (auto removed = remove(item.itemIdentifier); !removed) {
        return removed;
    }
    auto statement = database_.prepare(
        "INSERT INTO items (identifier, parent, file, domain, name, tags, item, favorite, used) "
        "VALUES (?,?,?,?,?,?,?,?,?)");
    if (!statement) {
        return Unexpected(statement.error());
    }
    statement->bind(1, item.itemIdentifier).bind(2, item.parentItemIdentifier);
    if (item.fileID) {
        statement->bind(3, static_cast<std::int64_t>(*item.fileID));
    } else {
        statement->bindNull(3);
    }
    if (item.hx_appContainerBundleIdentifier) {
        statement->bind(4, "#" + *item.hx_appContainerBundleIdentifier);
    } else {
        statement->bindNull(4);
    }
    statement->bind(5, item.filename).bind(6, joinedTags(item)).bind(7, itemJson(item));
    if (item.favoriteRank) {
        statement->bind(8, std::int64_t{1});
    } else {
        statement->bindNull(8);
    }
    if (item.lastUsedDate) {
        statement->bind(9, item.lastUsedDate->rfc3339());
    } else {
        statement->bindNull(9);
    }
    return statement->run();
}

Expected<void> Replica::removeWhere(const std::string& condition, std::string_view value) {
    auto statement = database_.prepare("DELETE FROM items WHERE " + condition);
    return statement ? statement->bind(1, value).run() : Unexpected(statement.error());
}

Expected<void> Replica::remove(std::string_view identifier) {
    return removeWhere("identifier = ?", identifier);
}

// With a folder goes what is known in it; "fid=N" also means the item of that file number.
Expected<void> Replica::removeTree(std::string_view identifier) {
    auto statement = database_.prepare(
        "WITH RECURSIVE gone(identifier) AS ("
        "SELECT identifier FROM items WHERE identifier = ?1 OR file = ?2 "
        "UNION SELECT items.identifier FROM items JOIN gone ON items.parent = gone.identifier) "
        "DELETE FROM items WHERE identifier IN gone");
    if (!statement) {
        return Unexpected(statement.error());
    }
    statement->bind(1, identifier);
    if (const auto number = fileNumber(identifier)) {
        statement->bind(2, *number);
    } else {
        statement->bindNull(2);
    }
    return statement->run();
}

Expected<void> Replica::add(std::span<const FileProviderItemPtr> items) {
    return inTransaction([&]() -> Expected<void> {
        for (const auto& item : items) {
            if (auto stored = put(*item); !stored) {
                return stored;
            }
        }
        return {};
    });
}

Expected<void> Replica::apply(const ItemChanges& changes) {
    return inTransaction([&]() -> Expected<void> {
        for (const std::string& identifier : changes.deleted) {
            if (auto removed = removeTree(identifier); !removed) {
                return removed;
            }
        }
        for (const auto& item : changes.updated) {
            if (auto stored = put(*item); !stored) {
                return stored;
            }
        }
        return writeAnchor(changes.anchor);
    });
}

Expected<void> Replica::removeDomains(std::span<const std::string> domains) {
    return inTransaction([&]() -> Expected<void> {
        for (const std::string& domain : domains) {
            if (auto removed = removeWhere("domain = ?", domain); !removed) {
                return removed;
            }
        }
        return {};
    });
}

Expected<std::vector<FileProviderItemPtr>> Replica::search(std::span<const std::string> words,
                                                           std::int64_t limit) {
    auto statement = database_.prepare(searchStatement(words));
    if (!statement) {
        return Unexpected(statement.error());
    }
    int position = 0;
    if (const std::string match = matchOf(words); !match.empty()) {
        statement->bind(++position, match);
    }
    for (const std::string& word : words) {
        if (!isIndexed(word)) {
            statement->bind(++position, word);
            statement->bind(++position, word);
        }
    }
    statement->bind(++position, limit);
    return itemsOf(std::move(statement));
}

Expected<std::vector<FileProviderItemPtr>> Replica::itemsOf(Expected<Statement> statement) {
    if (!statement) {
        return Unexpected(statement.error());
    }
    std::vector<FileProviderItemPtr> found;
    while (true) {
        const auto hasRow = statement->step();
        if (!hasRow) {
            return Unexpected(hasRow.error());
        }
        if (!*hasRow) {
            return found;
        }
        auto item = itemFromJson(statement->text(0));
        if (!item) {
            return Unexpected(item.error());
        }
        found.push_back(std::move(*item));
    }
}

Expected<std::vector<FileProviderItemPtr>> Replica::collection(const ItemCollection& collection,
                                                               std::int64_t limit) {
    if (collection.kind == ItemCollection::Kind::tagged) {
        auto tagged = database_.prepare(
            "SELECT item FROM items WHERE tags <> '' AND "
            "instr(char(10) || tags, char(10) || ? || char(10)) ORDER BY name LIMIT ?");
        if (tagged) {
            tagged->bind(1, collection.tag).bind(2, limit);
        }
        return itemsOf(std::move(tagged));
    }
    auto statement = database_.prepare(
        collection.kind == ItemCollection::Kind::favorites
            ? "SELECT item FROM items WHERE favorite IS NOT NULL ORDER BY name LIMIT ?"
            : "SELECT item FROM items WHERE used IS NOT NULL ORDER BY used DESC LIMIT ?");
    if (statement) {
        statement->bind(1, limit);
    }
    return itemsOf(std::move(statement));
}

Expected<std::vector<TagCount>> Replica::tags() {
    auto statement = database_.prepare("SELECT tags FROM items WHERE tags <> ''");
    if (!statement) {
        return Unexpected(statement.error());
    }
    std::map<std::string, std::uint64_t> counts;
    while (true) {
        const auto hasRow = statement->step();
        if (!hasRow) {
            return Unexpected(hasRow.error());
        }
        if (!*hasRow) {
            break;
        }
        for (const auto tag : std::views::split(statement->text(0), '\n')) {
            if (!tag.empty()) {
                ++counts[std::string(tag.begin(), tag.end())];
            }
        }
    }
    std::vector<TagCount> tags;
    for (const auto& [tag, count] : counts) {
        tags.push_back({tag, count});
    }
    return tags;
}

Expected<std::uint64_t> Replica::count() {
    auto statement = database_.prepare("SELECT count(*) FROM items");
    if (!statement) {
        return Unexpected(statement.error());
    }
    const auto hasRow = statement->step();
    if (!hasRow) {
        return Unexpected(hasRow.error());
    }
    return static_cast<std::uint64_t>(statement->number(0));
}

}  // namespace marrowdale::host
