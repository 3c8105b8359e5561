#include "providers/marrowdale/actions/MetadataActions.h"

#include <array>
#include <charconv>
#include <string>
#include <utility>
#include <variant>

#include "platform/foundation/KeyedArchive.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/actions/ReadWriteAccess.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemLookup.h"
#include "providers/marrowdale/items/ItemMetadata.h"
#include "providers/marrowdale/items/TagData.h"

namespace marrowdale {

namespace {

std::string text(std::string_view view) {
    return std::string(view);
}

std::string description(const Number& number) {
    constexpr std::size_t mostDigits = 32;
    std::array<char, mostDigits> digits{};
    const auto written = std::visit(
        [&](auto value) {
            return std::to_chars(digits.data(), digits.data() + digits.size(), value);
        },
        number);
    return {digits.data(), written.ptr};
}

// Sets the attribute to the archived object, or takes it away. An error is logged.
Expected<void> write(const Platform& platform, const URL& url, std::string_view name,
                     const std::optional<ArchivedObject>& object) {
    const auto value = object ? archive(*object) : Expected<Data>(Data());
    const int code =
        value ? withReadWriteAccess(platform, url,
                                    [&](const OpenFile& file) {
                                        return object ? setXattr(platform, file, name, *value)
                                                      : removeXattr(platform, file, name);
                                    })
              : value.error().code;
    if (code == 0) {
        return {};
    }
    const Error error = errorWithPOSIXCode(code);
    platform.log.error("can't set xattr " + text(name) + " on " + url.absoluteString() + "; " +
                       error.description());
    return Unexpected(error);
}

Expected<FileProviderItemPtr> readBack(const Platform& platform, std::string_view identifier) {
    auto item = fetchItem(platform, identifier);
    return item ? Expected<FileProviderItemPtr>(std::move(*item)) : Unexpected(item.error());
}

Expected<FileProviderItemPtr> answerTo(const Platform& platform, const Expected<void>& written,
                                       std::string_view identifier) {
    return written ? readBack(platform, identifier) : Unexpected(written.error());
}

ArchivedArray labels(const std::optional<Data>& tagData) {
    ArchivedArray list;
    const auto tags = tagData ? decodeTagData(*tagData) : Expected<std::vector<Tag>>();
    if (tags) {
        for (const Tag& tag : *tags) {
            list.emplace_back(tag.label);
        }
    }
    return list;
}

}  // namespace

void setLastUsedDate(const Platform& platform, const std::optional<Date>& date,
                     std::string_view itemIdentifier, const ItemCompletionHandler& handler) {
    if (itemIdentifier.starts_with('#')) {
        handler(Unexpected(errorInvalidParameter("itemIdentifier", itemIdentifier)));
        return;
    }
    const LogSection section(platform.log, [&] {
        return date ? "set last used date \"" + date->rfc3339() + "\" to item \"" +
                          text(itemIdentifier) + "\""
                    : "clearing last used date for item \"" + text(itemIdentifier) + "\"";
    });
    const auto url = fetchURLOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(url.error()));
        return;
    }
    // That it could not be written is in the log; a document is used all the same.
    static_cast<void>(write(platform, *url, lastUsedDateAttribute,
                            date ? std::optional<ArchivedObject>(*date) : std::nullopt));
    handler(readBack(platform, itemIdentifier));
}

void setTagData(const Platform& platform, const std::optional<Data>& tagData,
                std::string_view itemIdentifier, const ItemCompletionHandler& handler) {
    const LogSection section(
        platform.log, [&] { return "set tag data to item \"" + text(itemIdentifier) + "\""; });
    const auto url = urlOfItem(platform, itemIdentifier);
    if (!url) {
        const Error error = errorForNonExistentItem(itemIdentifier);
        platform.log.error("can't find URL for item; " + error.description());
        handler(Unexpected(error));
        return;
    }
    const auto written =
        write(platform, *url, tagDataAttribute, std::optional<ArchivedObject>(labels(tagData)));
    handler(answerTo(platform, written, itemIdentifier));
}

void setFavoriteRank(const Platform& platform, const std::optional<Number>& rank,
                     std::string_view itemIdentifier, const ItemCompletionHandler& handler) {
    const LogSection section(platform.log, [&] {
        return "set favorite rank \"" + (rank ? description(*rank) : "nil") + "\" to item \"" +
               text(itemIdentifier) + "\"";
    });
    const auto url = fetchURLOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(url.error()));
        return;
    }
    const auto written = write(platform, *url, favoriteRankAttribute,
                               rank ? std::optional<ArchivedObject>(*rank) : std::nullopt);
    handler(answerTo(platform, written, itemIdentifier));
}

}  // namespace marrowdale
