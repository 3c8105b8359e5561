#include "platform/linux/files/LinuxDirectoryEnumerator.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <functional>
#include <span>
#include <utility>

#include "platform/linux/files/EntryValues.h"
#include "platform/linux/files/Place.h"

namespace marrowdale::native {

Expected<std::unique_ptr<DirectoryEnumerator>> LinuxDirectoryEnumerator::open(
    const DirectoryEnumerationRequest& request, const FileSources& sources) {
    const auto place = Place::of(request.url, sources.trees);
    auto root = place ? place->openFolder() : Unexpected(place.error());
    if (!root) {
        return Unexpected(root.error());
    }
    FolderStack stack(request.url, std::move(root->descriptor), root->status, sources.trees,
                      request.errorHandler);
    if (const auto restored = stack.restore(request.position); !restored) {
        return Unexpected(restored.error());
    }
    return std::unique_ptr<DirectoryEnumerator>(
        new LinuxDirectoryEnumerator(request, sources, std::move(stack)));
}

LinuxDirectoryEnumerator::LinuxDirectoryEnumerator(const DirectoryEnumerationRequest& request,
                                                   const FileSources& sources, FolderStack stack)
    : sources_(sources),
      keys_(request.keys),
      options_(request.options),
      handler_(request.errorHandler),
      looks_(request.keys, request.attributeNames, request.prefetchStatus, sources),
      stack_(std::move(stack)) {}

Expected<std::uint64_t> LinuxDirectoryEnumerator::skip(std::uint64_t count) {
    return walk(count, &LinuxDirectoryEnumerator::skipEntry);
}

Expected<std::uint64_t> LinuxDirectoryEnumerator::walk(std::uint64_t count, Step step) {
    if (failure_) {
        return fail(*failure_);
    }
    beginBatch();
    std::uint64_t walked = 0;
    while (walked < count) {
        const auto entry = advance();
        if (!entry) {
            return fail(entry.error());
        }
        if (!*entry) {
            break;
        }
        ++walked;
        if (const auto done = (this->*step)(**entry); !done) {
            return fail(done.error());
        }
    }
    return walked;
}

Expected<std::uint64_t> LinuxDirectoryEnumerator::next(std::uint64_t limit,
                                                       std::vector<URL>& urls) {
    auto walked = walk(limit, &LinuxDirectoryEnumerator::takeEntry);
    if (!walked) {
        return walked;
    }
    if (const auto finished = finishFolder(); !finished) {
        return fail(finished.error());
    }
    if (keys_.contains(ResourceKey::documentIdentifier)) {
        auto known = confirmFolders();
        if (known) {
            known = assignDocumentIDs();
        }
        if (!known) {
            return fail(known.error());
        }
    }
    makeURLs(urls);
    return walked;
}

bool LinuxDirectoryEnumerator::takeUp(FolderStack::ErrorHandler errorHandler) {
    handler_ = errorHandler;
    if (failure_ || stack_.empty()) {
        return false;
    }
    const auto place = Place::of(stack_.rootURL(), sources_.trees);
    const auto status = place ? place->look() : Unexpected(place.error());
    return status && stack_.takeUp(*status, std::move(errorHandler));
}

// The next entry that counts, folders left and opened on the way.
Expected<std::optional<LinuxDirectoryEnumerator::Entry>> LinuxDirectoryEnumerator::advance() {
    while (!stack_.empty()) {
        if (!stack_.top().reader) {
            folderIsKnown_ = false;
            if (const auto opened = stack_.openTop(); !opened) {
                return Unexpected(opened.error());
            }
        }
        FolderStack::Level& level = stack_.top();
        auto entry = level.reader->next();
        if (!entry || !*entry) {
            if (const auto left = leaveFolder(entry); !left) {
                return Unexpected(left.error());
            }
            continue;
        }
        level.offset = (*entry)->position;
        if (!isHidden((*entry)->name)) {
            return entry;
        }
    }
    return std::optional<Entry>();
}

// At its end, or where it can't be read on.
Expected<void> LinuxDirectoryEnumerator::leaveFolder(const Expected<std::optional<Entry>>& read) {
    if (auto finished = finishFolder(); !finished) {
        return finished;
    }
    if (!read) {
        Error error = read.error();
        error.subject = stack_.topURL().path();
        // A folder that was removed while it was open says ENOENT.
        if (error.code != ENOENT && handler_ && !handler_(stack_.topURL(), error)) {
            return Unexpected(error);
        }
    }
    stack_.pop();
    folderIsKnown_ = false;
    return {};
}

bool LinuxDirectoryEnumerator::isHidden(std::string_view name) const {
    return options_.skipHiddenFiles && name.front() == '.';
}

bool LinuxDirectoryEnumerator::entersFolder(bool isPackage) const {
    return !options_.skipSubdirectoryDescendants && !(isPackage && options_.skipPackageDescendants);
}

Expected<void> LinuxDirectoryEnumerator::skipEntry(const Entry& entry) {
    const bool mayBeFolder = entry.type == DT_DIR || entry.type == DT_UNKNOWN;
    if (!mayBeFolder || !entersFolder(sources_.packages.isPackageName(entry.name))) {
        return {};
    }
    if (entry.type == DT_UNKNOWN) {
        const auto status = statEntry(stack_.top().reader->descriptor(), entry.cName());
        if (!status || !status->isDirectory()) {
            return {};
        }
    }
    // Its device and number are looked at when it is opened.
    stack_.push(entry.name, FileID{}, std::nullopt);
    return {};
}

// What is no folder is looked at later, together with what else the folder holds.
Expected<void> LinuxDirectoryEnumerator::takeEntry(const Entry& entry) {
    Pending& pending = pending_.emplace_back();
    pending.name = keepName(entry.name);
    pending.systemName = pending.name.data();
    pending.folder = batchFolder();
    if (entry.type != DT_DIR && entry.type != DT_UNKNOWN) {
        return {};
    }
    looks_.look(pending, innermost());
    const bool enters = !pending.dropped && pending.error == 0 && pending.status.isDirectory() &&
                        entersFolder(pending.values.isPackage);
    return enters ? enter() : Expected<void>();
}

EntryLooks::Folder LinuxDirectoryEnumerator::innermost() const {
    const FolderStack::Level& level = stack_.top();
    return {level.reader->descriptor(), level.mount, stack_.device()};
}

// A folder that may be read and not searched gives names and nothing else: told once.
Expected<void> LinuxDirectoryEnumerator::reportEntry(const Error& error) {
    if (std::exchange(stack_.top().reportedEntry, true) || !handler_) {
        return {};
    }
    return handler_(stack_.topURL(), error) ? Expected<void>() : Unexpected(error);
}

// Goes into the folder that was taken last.
Expected<void> LinuxDirectoryEnumerator::enter() {
    if (auto finished = finishFolder(); !finished) {
        return finished;
    }
    Pending& pending = pending_.back();
    // A package waits for its document identifier; the walk makes a URL of its own for it.
    if (!hasDocumentIdentifier(pending.values)) {
        pending.url =
            URL::listedChild(folders_[pending.folder].url, pending.name, std::move(pending.values));
    }
    stack_.push(pending.name, pending.status.fileID, pending.url);
    folderIsKnown_ = false;
    return {};
}

void LinuxDirectoryEnumerator::beginBatch() {
    pending_.clear();
    finished_ = 0;
    folders_.clear();
    folderIsKnown_ = false;
    requests_.clear();
    names_.release();
    batchStart_ = Date::now();
}

std::size_t LinuxDirectoryEnumerator::batchFolder() {
    if (!folderIsKnown_) {
        folders_.push_back({stack_.topURL(), stack_.top().folder});
        folderIsKnown_ = true;
    }
    return folders_.size() - 1;
}

std::string_view LinuxDirectoryEnumerator::keepName(std::string_view name) {
    auto* text = static_cast<char*>(names_.allocate(name.size() + 1, 1));
    std::memcpy(text, name.data(), name.size() + 1);
    return {text, name.size()};
}

// Does what needs the open folder, for all that was taken from it: looks, reads attributes, asks
// for access where a list may grant it.
Expected<void> LinuxDirectoryEnumerator::finishFolder() {
    const std::size_t first = std::exchange(finished_, pending_.size());
    const std::size_t count = pending_.size() - first;
    if (count == 0) {
        return {};
    }
    unfinished_.clear();
    for (Pending& pending : std::span(pending_).subspan(first)) {
        unfinished_.push_back(&pending);
    }
    looks_.finish(unfinished_, innermost(), batchStart_, EntryLooks::Threads::shared);
    return dropUnserved(first);
}

Expected<void> LinuxDirectoryEnumerator::dropUnserved(std::size_t first) {
    const auto begin = pending_.begin() + static_cast<std::ptrdiff_t>(first);
    Expected<void> goOn;
    for (auto pending = begin; pending != pending_.end(); ++pending) {
        if (goOn && pending->error != 0 && pending->error != ENOENT) {
            goOn = reportEntry(errorWithPOSIXCode(pending->error, "look at", pending->name));
        }
    }
    pending_.erase(std::remove_if(begin, pending_.end(), std::mem_fn(&Pending::dropped)),
                   pending_.end());
    finished_ = pending_.size();
    return goOn;
}

// A folder that went before the index knew of it is left out: nobody would ever tell that it is
// gone. A file has a document by which that is told.
Expected<void> LinuxDirectoryEnumerator::confirmFolders() {
    std::vector<Pending*> requested;
    for (Pending& pending : pending_) {
        if (pending.status.isDirectory() &&
            (pending.url || !hasDocumentIdentifier(pending.values))) {
            const BatchFolder& folder = folders_[pending.folder];
            requests_.push_back(
                {folder.fileID, folder.url.path(), pending.name, pending.status, {}});
            requested.push_back(&pending);
        }
    }
    auto confirmed =
        requests_.empty() ? Expected<void>() : sources_.documents.confirmFolders(requests_);
    for (std::size_t i = 0; confirmed && i < requested.size(); ++i) {
        requested[i]->dropped = !requests_[i].isThere;
    }
    requests_.clear();
    return confirmed;
}

Expected<void> LinuxDirectoryEnumerator::assignDocumentIDs() {
    for (const Pending& pending : pending_) {
        if (!pending.url && hasDocumentIdentifier(pending.values)) {
            const BatchFolder& folder = folders_[pending.folder];
            requests_.push_back(
                {folder.fileID, folder.url.path(), pending.name, pending.status, {}});
        }
    }
    if (requests_.empty()) {
        return {};
    }
    if (auto assigned = sources_.documents.assignDocumentIDs(requests_); !assigned) {
        return assigned;
    }
    auto request = requests_.begin();
    for (Pending& pending : pending_) {
        if (!pending.url && hasDocumentIdentifier(pending.values)) {
            pending.values.documentIdentifier = (request++)->document;
        }
    }
    return {};
}

void LinuxDirectoryEnumerator::makeURLs(std::vector<URL>& urls) {
    if (urls.empty()) {
        urls.reserve(pending_.size());
    }
    for (Pending& pending : pending_) {
        if (!pending.dropped) {
            urls.push_back(pending.url ? std::move(*pending.url)
                                       : URL::listedChild(folders_[pending.folder].url,
                                                          pending.name, std::move(pending.values)));
        }
    }
}

Unexpected LinuxDirectoryEnumerator::fail(Error error) {
    failure_ = error;
    return Unexpected(std::move(error));
}

}  // namespace marrowdale::native
