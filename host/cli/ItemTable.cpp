#include "host/cli/ItemTable.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "host/daemon/ReadableSize.h"
#include "host/requests/HarmlessText.h"
#include "host/requests/ItemJson.h"
#include "host/requests/TagNames.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view folderColour = "\x1B[1;34m";
constexpr std::string_view quietColour = "\x1B[2m";
constexpr std::string_view noColour = "\x1B[0m";

std::string sizeText(const FileProviderItem& item) {
    return item.documentSize ? readableSize(*item.documentSize) : "-";
}

std::string timeText(const FileProviderItem& item) {
    return item.contentModificationDate ? readableTime(*item.contentModificationDate)
                                        : std::string("-");
}

std::string nameText(const FileProviderItem& item, ItemTable::Colour colour) {
    std::string name = harmlessName(item.filename);
    if (item.isFolder()) {
        name += '/';
    }
    if (colour == ItemTable::Colour::none || !(item.isFolder() || item.isTrashed)) {
        return name;
    }
    return fmt::format("{}{}{}", item.isTrashed ? quietColour : folderColour, name, noColour);
}

using Details = std::vector<std::pair<std::string_view, std::string>>;

void addDate(Details& details, std::string_view name, const std::optional<Date>& date) {
    if (date) {
        details.emplace_back(
            name,
            date->rfc3339() + (isWithinRFC3339(*date) ? "" : " (outside the years 0 to 9999)"));
    }
}

std::string capabilityNames(std::uint64_t capabilities) {
    constexpr std::array<std::string_view, 6> names{"read",   "write", "move",
                                                    "rename", "trash", "delete"};
    std::string text;
    for (std::size_t bit = 0; bit < names.size(); ++bit) {
        if (((capabilities >> bit) & 1U) != 0) {
            text += (text.empty() ? "" : ", ") + std::string(names.at(bit));
        }
    }
    return text.empty() ? "none" : text;
}

void addMetadata(Details& details, const FileProviderItem& item) {
    addDate(details, "last used", item.lastUsedDate);
    if (item.tagData) {
        std::string tags;
        for (const std::string& tag : tagNames(item)) {
            tags += (tags.empty() ? "" : ", ") + harmlessName(tag);
        }
        details.emplace_back("tags", tags);
    }
    if (item.favoriteRank) {
        details.emplace_back(
            "favourite rank",
            std::visit([](auto rank) { return fmt::to_string(rank); }, *item.favoriteRank));
    }
    if (item.isTrashed) {
        details.emplace_back("trashed", "yes");
    }
}

Details detailsOf(const FileProviderItem& item) {
    Details details;
    details.emplace_back("identifier", harmlessName(item.itemIdentifier));
    details.emplace_back("name", harmlessName(item.filename));
    details.emplace_back("path", harmlessName(item.fileURL.path()));
    details.emplace_back("parent", harmlessName(item.parentItemIdentifier));
    details.emplace_back("type", harmlessLine(item.typeIdentifier));
    if (item.documentSize) {
        details.emplace_back("size", fmt::format("{} ({} bytes)", readableSize(*item.documentSize),
                                                 *item.documentSize));
    }
    addDate(details, "created", item.creationDate);
    addDate(details, "modified", item.contentModificationDate);
    if (item.childItemCount) {
        details.emplace_back("subfolders", fmt::to_string(*item.childItemCount));
    }
    details.emplace_back("allowed", capabilityNames(item.capabilities));
    addMetadata(details, item);
    if (item.fileID) {
        details.emplace_back("file number", fmt::to_string(*item.fileID));
    }
    if (item.hx_appContainerBundleIdentifier) {
        details.emplace_back("application", harmlessLine(*item.hx_appContainerBundleIdentifier));
    }
    return details;
}

}  // namespace

std::string ItemTable::page(const std::vector<FileProviderItemPtr>& items) {
    std::vector<std::string> sizes;
    sizes.reserve(items.size());
    for (const auto& item : items) {
        sizes.push_back(sizeText(*item));
        identifierWidth_ = std::max(identifierWidth_, item->itemIdentifier.size());
        typeWidth_ = std::max(typeWidth_, item->typeIdentifier.size());
        sizeWidth_ = std::max(sizeWidth_, sizes.back().size());
    }
    std::string text;
    for (std::size_t i = 0; i < items.size(); ++i) {
        const FileProviderItem& item = *items[i];
        fmt::format_to(std::back_inserter(text), "{:<{}}  {:<{}}  {:>{}}  {:<16}  {}\n",
                       item.itemIdentifier, identifierWidth_, item.typeIdentifier, typeWidth_,
                       sizes[i], sizeWidth_, timeText(item), nameText(item, colour_));
    }
    return text;
}

std::string itemDetails(const FileProviderItem& item) {
    const Details details = detailsOf(item);
    std::size_t width = 0;
    for (const auto& [name, value] : details) {
        width = std::max(width, name.size());
    }
    std::string text;
    for (const auto& [name, value] : details) {
        fmt::format_to(std::back_inserter(text), "{:<{}}  {}\n", name, width, value);
    }
    return text;
}

std::string readableTime(const Date& date) {
    if (!isWithinRFC3339(date)) {
        return date.seconds < 0 ? "before year 0" : "after year 9999";
    }
    const std::time_t seconds = date.seconds;
    std::tm local{};
    std::array<char, 64> buffer{};
    if (::localtime_r(&seconds, &local) == nullptr ||
        std::strftime(buffer.data(), buffer.size(), "%Y-%m-%d %H:%M", &local) == 0) {
        return date.rfc3339();
    }
    return buffer.data();
}

}  // namespace marrowdale::host
