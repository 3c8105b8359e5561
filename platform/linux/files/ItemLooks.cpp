#include "platform/linux/files/ItemLooks.h"

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/linux/files/EntryValues.h"
#include "platform/linux/files/Place.h"

namespace marrowdale::native {

namespace {

// The values that the URL of an item's folder brings along: what its identifier is made of.
constexpr ResourceKeySet folderKeys{ResourceKey::fileID, ResourceKey::isDirectory,
                                    ResourceKey::isPackage};

// So many items of a folder are worth a second thread of their own.
constexpr std::size_t largeGroup = 32;

std::string_view folderPath(const URL& url) {
    const std::string_view path = url.path();
    return path.substr(0, std::min(path.rfind('/'), path.size()));
}

// "." and ".." are no names that an item's values could be told from, nor is "/".
bool hasName(const URL& url) {
    return url.isFileURL() && url.path().size() > 1 &&
           url.standardized().path().size() == url.path().size();
}

}  // namespace

ItemLooks::ItemLooks(const LookRequest& request, const FileSources& sources)
    : sources_(sources),
      wantsDocumentIDs_(request.keys.contains(ResourceKey::documentIdentifier)),
      looks_(request.keys, request.attributeNames, request.prefetchStatus, sources),
      start_(Date::now()) {}

std::vector<Expected<URL>> ItemLooks::lookAt(std::span<const URL> urls) {
    sort(urls);
    locateGroups();
    lookInGroups();
    if (wantsDocumentIDs_) {
        confirmFolders();
        assignDocumentIDs();
    }
    std::vector<Expected<URL>> answers;
    answers.reserve(urls.size());
    for (const URL& url : urls) {
        answers.emplace_back(hasName(url) ? url : url.withoutCachedValues());
    }
    for (const Group& group : groups_) {
        for (Item& item : group.items) {
            answers[item.answer] = answerFor(item, group);
        }
    }
    return answers;
}

// Into groups: those that lie in one folder below a root, and each of the others alone.
void ItemLooks::sort(std::span<const URL> urls) {
    std::vector<std::pair<std::string_view, const URL*>> sorted;  // the folder's path first
    sorted.reserve(urls.size());
    for (const URL& url : urls) {
        if (hasName(url)) {
            sorted.emplace_back(
                sources_.trees.holds(url.path()) ? folderPath(url) : std::string_view(), &url);
        }
    }
    std::ranges::sort(sorted);
    items_.reserve(sorted.size());
    for (const auto& [folder, url] : sorted) {
        Item& item = items_.emplace_back();
        item.url = url;
        item.answer = static_cast<std::size_t>(url - urls.data());
    }
    for (std::size_t begin = 0; begin < sorted.size();) {
        std::size_t end = begin + 1;
        while (end < sorted.size() && !sorted[begin].first.empty() &&
               sorted[end].first == sorted[begin].first) {
            ++end;
        }
        groups_.emplace_back().items = std::span(items_).subspan(begin, end - begin);
        begin = end;
    }
}

// Nothing is mounted below a root that is served, so what holds for the root's mount holds below.
void ItemLooks::locateGroups() {
    const Group* last = nullptr;  // the last one that lies in a tree
    for (Group& group : groups_) {
        const std::string& path = group.items.front().url->path();
        group.location = last != nullptr ? sources_.trees.locate(path, **last->location)
                                         : sources_.trees.locate(path);
        if (!group.location || !*group.location) {
            continue;
        }
        const ServedTrees::Location& location = **group.location;
        const bool isSame = last != nullptr && (*last->location)->keptOpen == location.keptOpen;
        group.mount = isSame ? last->mount : mountOf(location.root);
        last = &group;
    }
}

// Two threads share the folders; where these are few and large, the items of each.
void ItemLooks::lookInGroups() {
    const bool areLarge = items_.size() >= groups_.size() * largeGroup;
    const auto look = [&](std::size_t begin, std::size_t end) {
        for (Group& group : std::span(groups_).subspan(begin, end - begin)) {
            lookIn(group, areLarge ? EntryLooks::Threads::shared : EntryLooks::Threads::one);
        }
    };
    if (areLarge) {
        look(0, groups_.size());
    } else {
        sources_.work.run(groups_.size(), look);
    }
}

void ItemLooks::lookIn(Group& group, EntryLooks::Threads threads) const {
    const auto place = group.location
                           ? Place::at(*group.items.front().url, *group.location, sources_.trees)
                           : Unexpected(group.location.error());
    if (!place) {
        group.failure = place.error();
        return;
    }
    std::vector<LookedEntry*> entries;
    for (Item& item : group.items) {
        item.name = item.url->lastPathComponent();
        // The path's last component ends where the path does, so a NUL byte is behind it.
        item.systemName = place->hasParent() ? item.name.data() : place->name();
        entries.push_back(&item);
    }
    if (place->hasParent()) {
        findFolder(group, place->directory());
    }
    const Mount mount = group.mount ? *group.mount : place->mount();
    looks_.finish(entries, {place->directory(), mount, place->device()}, start_, threads);
}

// What can't be found out of the folder is asked for when somebody needs it.
void ItemLooks::findFolder(Group& group, int descriptor) const {
    const URL plain = group.items.front().url->deletingLastPathComponent();
    const auto status = statEntry(descriptor, "");
    if (!status || !hasName(plain)) {
        return;
    }
    group.folder = status->fileID;
    group.folderURL =
        URL::listedChild(plain.deletingLastPathComponent(), plain.lastPathComponent(),
                         describeEntry(*status, plain.lastPathComponent(), folderKeys, sources_));
}

// A folder that went before the index knew of it is not there: nobody would ever tell that it is
// gone. Where the index fails, whoever follows it is told to begin anew.
void ItemLooks::confirmFolders() {
    std::vector<DocumentIndex::Request> requests;
    std::vector<Item*> requested;
    for (const Group& group : groups_) {
        for (Item& item : group.items) {
            if (!group.failure && !item.dropped && group.folderURL &&
                !hasDocumentIdentifier(item.values)) {
                requests.push_back(
                    {group.folder, group.folderURL->path(), item.name, item.status, {}});
                requested.push_back(&item);
            }
        }
    }
    if (requests.empty() || !sources_.documents.confirmFolders(requests)) {
        return;
    }
    for (std::size_t i = 0; i < requests.size(); ++i) {
        requested[i]->dropped = !requests[i].isThere;
    }
}

// Where they can't be had, whoever asks for one gets the reason.
void ItemLooks::assignDocumentIDs() {
    std::vector<DocumentIndex::Request> requests;
    std::vector<Item*> requested;
    for (const Group& group : groups_) {
        for (Item& item : group.items) {
            if (group.failure || item.dropped || !hasDocumentIdentifier(item.values)) {
                continue;
            }
            item.values.known.erase(ResourceKey::documentIdentifier);
            if (group.folderURL) {
                requests.push_back(
                    {group.folder, group.folderURL->path(), item.name, item.status, {}});
                requested.push_back(&item);
            }
        }
    }
    if (requests.empty() || !sources_.documents.assignDocumentIDs(requests)) {
        return;
    }
    for (std::size_t i = 0; i < requests.size(); ++i) {
        requested[i]->dropped = !requests[i].isThere;
        requested[i]->values.known.insert(ResourceKey::documentIdentifier);
        requested[i]->values.documentIdentifier = requests[i].document;
    }
}

Expected<URL> ItemLooks::answerFor(Item& item, const Group& group) {
    if (group.failure) {
        return Unexpected(itemError(*group.failure, *item.url));
    }
    if (item.dropped) {
        return Unexpected(itemError(
            errorWithPOSIXCode(item.error != 0 ? item.error : ENOENT, "look at", {}), *item.url));
    }
    return URL::listedChild(
        group.folderURL ? *group.folderURL : item.url->deletingLastPathComponent(), item.name,
        std::move(item.values));
}

}  // namespace marrowdale::native
