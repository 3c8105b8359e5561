#include "providers/marrowdale/actions/TrashActions.h"

#include <algorithm>
#include <memory>
#include <utility>
#include <variant>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/actions/ActionCompletion.h"
#include "providers/marrowdale/actions/TrashAttributes.h"
#include "providers/marrowdale/items/AppLibraryOfURL.h"
#include "providers/marrowdale/items/ItemLookup.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentsName = "Documents";

std::string text(std::string_view view) {
    return std::string(view);
}

std::string listed(const std::vector<std::string>& components) {
    std::string list = "[";
    for (const std::string& component : components) {
        list.append(list.size() == 1 ? "" : ", ").append(component);
    }
    return list + "]";
}

// The components up to the first that is named "Documents"; empty when there is none.
std::vector<std::string> componentsToDocuments(const URL& url) {
    std::vector<std::string> components;
    for (const std::string_view component : url.pathComponents()) {
        components.emplace_back(component);
        if (component == documentsName) {
            return components;
        }
    }
    return {};
}

Expected<FileProviderItemPtr> didTrash(const Platform& platform, const URL& source,
                                       const Expected<URL>& answer) {
    if (!answer) {
        return Unexpected(hostError(platform, answer.error()));
    }
    writeTrashDate(platform, *answer, Date::now());
    writePutBack(platform, source, *answer);
    return freshItemAt(platform, *answer);
}

Expected<FileProviderItemPtr> didUntrash(const Platform& platform, const Expected<URL>& answer) {
    if (!answer) {
        return Unexpected(hostError(platform, answer.error()));
    }
    platform.log.debug([] { return "removing trash date xattr"; });
    writeTrashDate(platform, *answer, std::nullopt);
    return freshItemAt(platform, *answer);
}

// A real folder stands there: nothing can be put back into anything else.
bool isReachable(const Platform& platform, const URL& url) {
    const auto value = platform.fileSystem.resourceValue(url, ResourceKey::isDirectory);
    const bool* isDirectory = value ? std::get_if<bool>(&*value) : nullptr;
    return isDirectory != nullptr && *isDirectory;
}

std::optional<URL> givenParent(const Platform& platform,
                               const std::optional<std::string>& identifier) {
    const auto url =
        identifier ? urlOfItem(platform, *identifier) : Unexpected(errorForNonExistentItem({}));
    if (!url) {
        return std::nullopt;
    }
    if (isTrashedPath(url->path())) {
        platform.log.debug([&] {
            return "can't use provided parent item " + *identifier + " because it's trashed; " +
                   url->path();
        });
        return std::nullopt;
    }
    return *url;
}

std::optional<URL> reachablePutBack(const Platform& platform, LocalItem& item) {
    auto url = item.putBackURL(platform);
    if (!url) {
        platform.log.debug([] { return "no putback url"; });
        return std::nullopt;
    }
    const bool reachable = isReachable(platform, *url);
    platform.log.debug([&] {
        return text(reachable ? "putback url is " : "putback url is not reachable; ") +
               url->absoluteString();
    });
    return reachable ? url : std::nullopt;
}

std::optional<URL> libraryRoot(const Platform& platform, const LocalItem& item) {
    const auto library =
        item.hx_isContainer() ? nullptr : appLibraryItemHolding(platform, item.fileURL);
    if (!library) {
        return std::nullopt;
    }
    platform.log.debug(
        [&] { return "use " + library->itemIdentifier + "'s root as recover location"; });
    return library->fileURL;
}

std::optional<URL> recoverLocation(const Platform& platform, LocalItem& item,
                                   const std::optional<std::string>& parentIdentifier) {
    auto location = givenParent(platform, parentIdentifier);
    if (!location) {
        location = reachablePutBack(platform, item);
    }
    return location ? location : libraryRoot(platform, item);
}

}  // namespace

std::optional<URL> trashURLWithComponents(const std::vector<std::string>& components) {
    const auto isPossible = [](const std::string& component) {
        return !component.empty() && component.find('\0') == std::string::npos;
    };
    if (components.empty() || !std::ranges::all_of(components, isPossible)) {
        return std::nullopt;
    }
    URL url = URL::fileURL(components.front());
    for (auto i = components.begin() + 1; i != components.end(); ++i) {
        url = url.appendingPathComponent(*i);
    }
    return url;
}

Expected<URL> trashFolderFor(const Platform& platform, const URL& url) {
    auto components = componentsToDocuments(url);
    if (components.empty()) {
        platform.log.error("no Documents directory found in path \"" + url.path() + "\"");
        return Unexpected(errorInvalidParameter("sourceURL", url.absoluteString()));
    }
    components.emplace_back(trashFolderName);
    const auto trash = trashURLWithComponents(components);
    if (!trash) {
        platform.log.error("can't build trash URL from components \"" + listed(components) + "\"");
        return Unexpected(errorInvalidParameter("trashComponents", listed(components)));
    }
    platform.log.debug([&] { return "trash is located at \"" + trash->path() + "\""; });
    return *trash;
}

void trashItem(const Platform& platform, std::string_view itemIdentifier,
               ItemCompletionHandler handler) {
    const LogSection section(platform.log,
                             [&] { return "trash item \"" + text(itemIdentifier) + "\""; });
    const auto url = urlOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(errorForNonExistentItem(itemIdentifier)));
        return;
    }
    const auto trash = trashFolderFor(platform, *url);
    if (!trash) {
        handler(Unexpected(trash.error()));
        return;
    }
    if (const auto made = platform.fileSystem.createDirectory(*trash); !made) {
        handler(Unexpected(made.error()));
        return;
    }
    platform.fileOperations.trashIntoFolder(
        *url, *trash,
        [&platform, source = *url, handler = std::move(handler)](const Expected<URL>& answer) {
            handler(didTrash(platform, source, answer));
        });
}

void untrashItem(const Platform& platform, std::string_view itemIdentifier,
                 const std::optional<std::string>& toParentItemIdentifier,
                 ItemCompletionHandler handler) {
    const LogSection section(platform.log,
                             [&] { return "untrash item \"" + text(itemIdentifier) + "\""; });
    const auto url = urlOfItem(platform, itemIdentifier);
    if (!url) {
        handler(Unexpected(errorForNonExistentItem(itemIdentifier)));
        return;
    }
    const auto item = fetchItem(platform, itemIdentifier);
    if (!item) {
        handler(Unexpected(item.error()));
        return;
    }
    if (!(*item)->isTrashed) {
        platform.log.debug([] { return "item is not in trash"; });
        handler(Unexpected(errorInvalidParameter("itemIdentifier", itemIdentifier)));
        return;
    }
    const auto location = recoverLocation(platform, **item, toParentItemIdentifier);
    if (!location) {
        platform.log.debug(
            [&] { return "can't compute valid parent URL for " + text(itemIdentifier); });
        handler(Unexpected(errorInvalidParameter("itemIdentifier", itemIdentifier)));
        return;
    }
    platform.fileOperations.moveIntoFolderAvoidingCollision(
        *url, *location, [&platform, handler = std::move(handler)](const Expected<URL>& answer) {
            handler(didUntrash(platform, answer));
        });
}

void deleteItem(const Platform& platform, std::string_view itemIdentifier,
                ErrorCompletionHandler handler) {
    const LogSection section(platform.log,
                             [&] { return "delete item \"" + text(itemIdentifier) + "\""; });
    const auto url = urlOfItem(platform, itemIdentifier);
    if (!url) {
        handler(errorForNonExistentItem(itemIdentifier));
        return;
    }
    // Asked for again, behind all looks at the place, which another file may have taken meanwhile.
    const auto file = fileWithItemIdentifier(platform, itemIdentifier);
    if (!file && itemIdentifier.find('=') != std::string_view::npos) {
        handler(errorForNonExistentItem(itemIdentifier));
        return;
    }
    const URL meant = url->withoutCachedValues();
    if (file) {
        meant.setCachedResourceValue(ResourceKey::fileID, Number(raw(*file)));
    }
    platform.fileOperations.deleteItemAtURL(meant, std::move(handler));
}

}  // namespace marrowdale
