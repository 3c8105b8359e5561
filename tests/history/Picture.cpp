#include "tests/history/Picture.h"

#include <algorithm>
#include <limits>
#include <set>
#include <sys/stat.h>

#include <gtest/gtest.h>

#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"

namespace marrowdale::tests {

namespace {

constexpr std::size_t keptLines = 8;
constexpr std::string_view folderMark = "fid=";

// 0 where nothing stands.
std::uint64_t fileAt(const std::string& path) {
    struct stat status{};
    return ::lstat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

// Whether the file is still there under that name.
bool stands(const Picture::Item& item) {
    return fileAt(item.path) == item.fileID;
}

std::string describe(const std::string& identifier, const Picture::Item& item) {
    return identifier + " at " + item.path + ", file " + std::to_string(item.fileID) + ", " +
           std::to_string(item.size) + " bytes of " + std::to_string(item.modified);
}

}  // namespace

void Picture::setWorld(TestWorld* world) {
    const std::lock_guard lock(mutex_);
    world_ = world;
}

void Picture::setWithin(std::function<void()> within) {
    const std::lock_guard lock(mutex_);
    within_ = std::move(within);
}

// From what the item says, which may be older than what stands there by now. A link's own number is
// not in it.
Picture::Item Picture::itemOf(const LocalItem& item) {
    Item made;
    made.path = item.fileURL.path();
    made.isFolder = item.isFolder() && item.itemIdentifier.starts_with(folderMark);
    const bool isLink = item.typeIdentifier == "inode/symlink";
    made.fileID = isLink ? fileAt(made.path) : item.fileID.value_or(0);
    made.folder = item.parentItemIdentifier.starts_with(folderMark)
                      ? std::stoull(item.parentItemIdentifier.substr(folderMark.size()))
                      : fileAt(made.path.substr(0, made.path.rfind('/')));
    if (!isLink && item.documentSize) {
        made.size = *item.documentSize;
        const Date modified = item.contentModificationDate.value_or(Date());
        made.modified = modified.seconds * 1'000'000'000LL + modified.nanoseconds;
    }
    return made;
}

Picture::Found Picture::walk(const std::string& folder) const {
    FSDirectoryEnumerator request;
    request.urls = {URL::fileURL(folder)};
    request.recursively = true;
    request.limit = std::numeric_limits<std::uint64_t>::max();
    request.keys = LocalItem::listingKeys();
    request.errorHandler = [](const URL&, const Error&) { return true; };
    std::vector<URL> urls;
    if (const auto done = request.enumerate(world_->platform, urls); !done) {
        ADD_FAILURE() << done.error().description();
    }
    Found found;
    for (const URL& url : urls) {
        // What goes meanwhile is told of; what takes its place is looked at once more, so that no
        // identifier is kept with another file's number.
        for (std::uint64_t file = fileAt(url.path()); file != 0;) {
            const auto item = LocalItem::initWithURL(world_->platform, URL::fileURL(url.path()));
            Item made = item ? itemOf(*item) : Item();
            if (made.fileID == file) {
                found.emplace_back(item->itemIdentifier, std::move(made));
            }
            file = made.fileID == file ? 0 : made.fileID;
        }
    }
    return found;
}

void Picture::fill() {
    const std::lock_guard lock(mutex_);
    items_.clear();
    for (auto& [identifier, item] : walk(world_->root())) {
        remember(identifier, std::move(item));
    }
}

bool Picture::knowsPath(const std::string& path) const {
    const std::lock_guard lock(mutex_);
    return std::ranges::any_of(items_, [&](const auto& known) {
        return std::ranges::find(known.second, path, &Item::path) != known.second.end();
    });
}

std::size_t Picture::historiesDone() const {
    const std::lock_guard lock(mutex_);
    return histories_;
}

std::size_t Picture::resets() const {
    const std::lock_guard lock(mutex_);
    return resets_;
}

void Picture::remember(const std::string& identifier, Item item) {
    auto& names = items_[identifier];
    std::erase_if(names, [&](const Item& name) { return name.path == item.path || !stands(name); });
    names.push_back(std::move(item));
}

void Picture::forget(const std::string& identifier) {
    const auto known = items_.find(identifier);
    if (known == items_.end()) {
        return;
    }
    const std::vector<Item> names = std::move(known->second);
    items_.erase(known);
    for (const Item& name : names) {
        if (name.isFolder) {
            forgetBelow(name.fileID);
        }
    }
}

void Picture::forgetHidden(const std::string& identifier, const Item& item) {
    for (auto& [known, names] : items_) {
        if (known == identifier || !known.starts_with("did=")) {
            continue;
        }
        const DocumentID document{static_cast<std::uint32_t>(std::stoul(known.substr(4)))};
        std::erase_if(names, [&](const Item& name) {
            return name.path == item.path && name.fileID == item.fileID &&
                   world_->store->resolveDocumentID(document, world_->store->device());
        });
    }
    std::erase_if(items_, [](const auto& known) { return known.second.empty(); });
}

void Picture::forgetBelow(std::uint64_t folder) {
    std::vector<std::uint64_t> folders;
    for (auto& [identifier, names] : items_) {
        std::erase_if(names, [&](const Item& name) {
            if (name.folder == folder && name.isFolder) {
                folders.push_back(name.fileID);
            }
            return name.folder == folder;
        });
    }
    std::erase_if(items_, [](const auto& known) { return known.second.empty(); });
    for (const std::uint64_t below : folders) {
        forgetBelow(below);
    }
}

void Picture::note(const std::string& line, const std::string& identifier) {
    auto& lines = told_[identifier];
    lines.push_back(line);
    if (lines.size() > keptLines) {
        lines.erase(lines.begin());
    }
}

void Picture::fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                         const FileEvent& event) {
    const std::lock_guard lock(mutex_);
    const std::string& identifier = item->itemIdentifier;
    note(std::to_string(raw(event.id)) + " change " + item->fileURL.path() + " of " +
             std::to_string(event.flags >> 16U),
         identifier);
    if (item->fileURL.path() != world_->root()) {
        const auto known = items_.find(identifier);
        Item now = itemOf(*item);
        if (event.fileID && now.fileID != raw(*event.fileID)) {
            now.fileID = raw(*event.fileID);  // of a link that is there no more
        }
        const bool moved =
            known != items_.end() && now.isFolder && known->second.front().path != now.path;
        if (moved) {
            forget(identifier);
        }
        const bool rescans = now.isFolder && (moved || (event.flags & FileEventFlag::renamed) != 0);
        const std::string path = now.path;
        const std::uint64_t file = now.fileID;
        forgetHidden(identifier, now);
        remember(identifier, std::move(now));
        if (rescans) {
            forgetBelow(file);
            for (auto& [below, found] : walk(path)) {
                remember(below, std::move(found));
            }
        }
    }
    if (within_) {
        within_();
    }
}

void Picture::fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                         const FileEvent& event) {
    const std::lock_guard lock(mutex_);
    note(std::to_string(raw(event.id)) + " delete " + path, identifier);
    if (identifier.starts_with("fid=")) {
        const std::uint64_t fileID = std::stoull(identifier.substr(4));
        std::vector<std::string> gone;
        for (const auto& [known, names] : items_) {
            if (std::ranges::find(names, fileID, &Item::fileID) != names.end()) {
                gone.push_back(known);
            }
        }
        for (const std::string& known : gone) {
            note(std::to_string(raw(event.id)) + " delete of its file at " + path, known);
            forget(known);
        }
    }
    forget(identifier);
    if (within_) {
        within_();
    }
}

void Picture::fsEventReaderDidFinishHistory(EventID /*eventID*/) {
    const std::lock_guard lock(mutex_);
    ++histories_;
}

void Picture::fsEventReaderMustReset() {
    const std::lock_guard lock(mutex_);
    ++resets_;
}

std::vector<std::string> Picture::differences() const {
    const std::lock_guard lock(mutex_);
    std::map<std::string, std::vector<Item>> there;
    std::map<std::uint64_t, std::string> identifiers;
    std::vector<std::string> found;
    for (auto& [identifier, item] : walk(world_->root())) {
        const auto first = identifiers.emplace(item.fileID, identifier).first;
        if (first->second != identifier) {
            found.push_back("a file with two identifiers: " + describe(identifier, item) + "; " +
                            first->second);
        }
        auto& items = there[identifier];
        if (!items.empty() && items.front().fileID != item.fileID) {
            found.push_back("an identifier of two files: " + describe(identifier, item) + "; " +
                            items.front().path);
        }
        items.push_back(std::move(item));
    }
    const auto explain = [&](const std::string& what, const std::string& identifier,
                             const Item& item) {
        std::string text = what + ": " + describe(identifier, item);
        const auto lines = told_.find(identifier);
        if (lines != told_.end()) {
            for (const std::string& line : lines->second) {
                text += "\n    " + line;
            }
        }
        found.push_back(text);
    };
    for (const auto& [identifier, items] : there) {
        const auto known = items_.find(identifier);
        if (known == items_.end()) {
            explain("missing", identifier, items.front());
            continue;
        }
        for (const Item& item : known->second) {
            const auto same = std::ranges::find(items, item.path, &Item::path);
            if (same == items.end()) {
                explain("known at " + item.path, identifier, items.front());
            } else if (same->fileID != item.fileID || same->size != item.size ||
                       same->modified != item.modified) {
                explain("known as " + describe(identifier, item) + " and now", identifier, *same);
            }
        }
        for (const Item& item : items) {
            if (std::ranges::find(known->second, item.path, &Item::path) == known->second.end()) {
                explain("a name is missing", identifier, item);
            }
        }
    }
    for (const auto& [identifier, names] : items_) {
        if (!there.contains(identifier)) {
            explain("too much", identifier, names.front());
        }
    }
    return found;
}

}  // namespace marrowdale::tests
