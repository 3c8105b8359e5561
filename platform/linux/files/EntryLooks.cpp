#include "platform/linux/files/EntryLooks.h"

#include <functional>
#include <utility>

#include "platform/linux/files/EntryValues.h"

namespace marrowdale::native {

namespace {

// Calls `body` for stretches that together are [0, count).
void runOn(EntryLooks::Threads threads, SharedWork& work, std::size_t count,
           const std::function<void(std::size_t, std::size_t)>& body) {
    if (threads == EntryLooks::Threads::shared) {
        work.run(count, body);
    } else {
        body(0, count);
    }
}

}  // namespace

EntryLooks::EntryLooks(ResourceKeySet keys, std::vector<std::string> attributeNames,
                       bool prefetchesStatus, const FileSources& sources)
    : sources_(sources),
      keys_(keys),
      prefetchesStatus_(prefetchesStatus),
      wantsAccess_(keys.contains(ResourceKey::isReadable) ||
                   keys.contains(ResourceKey::isWritable)),
      attributes_(std::move(attributeNames)) {}

void EntryLooks::look(LookedEntry& entry, const Folder& folder) const {
    entry.looked = true;
    const auto status = statEntry(folder.descriptor, entry.systemName);
    if (!status) {
        entry.dropped = true;
        entry.error = status.error().code;
    } else if (folder.device && !sources_.trees.includes(*folder.device, *status)) {
        entry.dropped = true;
    } else {
        entry.status = *status;
        describe(entry, folder);
    }
}

void EntryLooks::describe(LookedEntry& entry, const Folder& folder) const {
    const EntryStatus& status = entry.status;
    entry.values = describeEntry(status, entry.name, keys_, sources_);
    if (!prefetchesStatus_) {
        return;
    }
    if (!status.isSymbolicLink()) {
        entry.values.hasStatus = true;
        entry.values.status = fileStatusOf(status, sources_.documents);
    } else if (const auto target = statTarget(folder.descriptor, entry.systemName)) {
        entry.values.hasStatus = true;
        entry.values.status = fileStatusOf(*target, sources_.documents);
    }
}

void EntryLooks::finish(std::span<LookedEntry* const> entries, const Folder& folder, Date start,
                        Threads threads) const {
    runOn(threads, sources_.work, entries.size(), [&](std::size_t begin, std::size_t end) {
        for (LookedEntry* entry : entries.subspan(begin, end - begin)) {
            if (!entry->looked) {
                look(*entry, folder);
            }
            entry->unread = !entry->dropped && !findAttributes(*entry, folder);
        }
    });
    std::vector<LookedEntry*> unread;
    for (LookedEntry* entry : entries) {
        if (entry->unread) {
            unread.push_back(entry);
        }
    }
    if (unread.empty()) {
        return;
    }
    // A thread that went into the folder is the only one that can read there.
    const Threads readers =
        sources_.calls.method() == AttributeCalls::Method::worker ? Threads::one : threads;
    sources_.calls.inFolder(folder.descriptor, [&](const AttributeCalls::InFolder& calls) {
        runOn(readers, sources_.work, unread.size(), [&](std::size_t begin, std::size_t end) {
            for (LookedEntry* entry : std::span(unread).subspan(begin, end - begin)) {
                readAttributes(*entry, folder, calls, start);
            }
        });
    });
}

bool EntryLooks::findAttributes(LookedEntry& entry, const Folder& folder) const {
    // Links carry no attributes of ours, and their bits say everything.
    const bool mustList =
        !entry.status.isSymbolicLink() &&
        (attributes_.asksForNames() ||
         (wantsAccess_ && dependsOnAccessList(entry.status, sources_.credentials)));
    if (!mustList) {
        setAttributes(entry, folder, {});
        return true;
    }
    const auto cached = sources_.attributes.find(entry.status, attributes_.fingerprint());
    if (cached) {
        setAttributes(entry, folder, *cached);
    }
    return cached.has_value();
}

void EntryLooks::readAttributes(LookedEntry& entry, const Folder& folder,
                                const AttributeCalls::InFolder& calls, Date start) const {
    const AttributeReader::Answer answer = attributes_.read(calls, entry.systemName);
    if (answer.complete) {
        sources_.attributes.insert(entry.status, attributes_.fingerprint(), answer.found, start);
    }
    setAttributes(entry, folder, answer.found);
}

void EntryLooks::setAttributes(LookedEntry& entry, const Folder& folder,
                               const FoundAttributes& found) const {
    PrefetchedValues& values = entry.values;
    values.attributes = found.set ? found.set : attributes_.emptySet();
    if (!wantsAccess_) {
        return;
    }
    const bool ask = found.hasAccessList && dependsOnAccessList(entry.status, sources_.credentials);
    const Access access = ask ? askAccess(folder.descriptor, entry.systemName)
                              : computeAccess(entry.status, sources_.credentials, folder.mount);
    values.isReadable = access.readable;
    values.isWritable = access.writable;
}

}  // namespace marrowdale::native
