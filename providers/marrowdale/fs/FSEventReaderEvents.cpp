#include <algorithm>
#include <array>
#include <utility>

#include "providers/marrowdale/fs/DocIDChangePath.h"
#include "providers/marrowdale/fs/FSEventDescription.h"
#include "providers/marrowdale/fs/FSEventReader.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemLook.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentPathMark = ".docid/";
constexpr std::string_view documentPathFormat = "/.docid/$dev/changed/$docid/src=$src,dst=$dst";

std::string quoted(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

bool says(const FileEvent& event, std::uint32_t flags) {
    return (event.flags & flags) != 0;
}

bool isMoveToHere(const FileEvent& event) {
    return says(event, FileEventFlag::renamed) && !says(event, FileEventFlag::gone);
}

bool saysDropped(const FileEvent& event) {
    return says(event, FileEventFlag::userDropped | FileEventFlag::kernelDropped);
}

// `url` is contained in `root`, or is it; both without "." and "..".
bool isHiddenBelow(const URL& root, const URL& url) {
    const std::string& outer = root.path();
    const std::size_t begin = outer.size() == 1 ? 0 : outer.size();
    return url.path().find("/.", begin) != std::string::npos;
}

// What stands at a place: the entry itself, where it is a link too.
struct Entry {
    URL url;  // with all that the item is made of, of one look
    bool exists = false;
    std::optional<FileID> fileID = std::nullopt;  // unless it can't be told
};

bool isMissing(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::noSuchFile);
}

// Looked at when the event's turn comes: what is told of a place must not be older than what the
// events behind it say of it.
Entry entryAt(const Platform& platform, const URL& url) {
    const auto look = std::move(looksAt(platform, std::span(&url, 1)).front());
    if (!look) {
        return {.url = url, .exists = !isMissing(look.error())};
    }
    const auto value = platform.fileSystem.resourceValue(*look, ResourceKey::fileID);
    if (!value) {
        return {.url = *look, .exists = !isMissing(value.error())};
    }
    const auto* number = std::get_if<Number>(&*value);
    const auto fileID = number ? unsignedValue(*number) : std::nullopt;
    return {.url = *look,
            .exists = true,
            .fileID = fileID ? std::optional(FileID{*fileID}) : std::nullopt};
}

std::shared_ptr<LocalItem> makeItem(const Platform& platform, const URL& url) {
    return LocalItem::initWithURL(platform, url,
                                  {.customItemID = {},
                                   .customParentItemID = {},
                                   .customFilename = {},
                                   .hasLumenoDomainIdentifier = true,
                                   .bundleIdentifier = {}});
}

}  // namespace

void FSEventReader::handleBatch(const Run& run, std::span<const FileEvent> events) {
    logDecision([&] { return "fsevent: received " + std::to_string(events.size()) + " events"; });
    // What left with an event of an earlier batch has no more events.
    std::erase_if(untold_, [](const auto& untold) { return untold.second; });
    if (delegate_.lock() && !run.isStopped) {
        allocateDocuments(events);
    }
    for (const FileEvent& event : events) {
        const auto delegate = delegate_.lock();
        if (!delegate || run.isStopped) {
            return;
        }
        std::optional<LogSection> section;
        if (verbose_) {
            section.emplace(platform_.log,
                            [&] { return " fsevents: " + marrowdale::description(event); });
        }
        if (!handle(run, *delegate, event)) {
            return;
        }
        if (!says(event, FileEventFlag::eventIDsWrapped)) {
            countAsProcessed(event.id);
        }
    }
}

// All at once, because each would cost a sync of the disk. What fails here fails, and is told,
// where the item is made.
void FSEventReader::allocateDocuments(std::span<const FileEvent> events) const {
    std::vector<std::string> paths;
    for (const FileEvent& event : events) {
        const bool isOfFile = event.path && !event.path->empty() &&
                              !says(event, FileEventFlag::gone | FileEventFlag::isFolder |
                                               FileEventFlag::documentMoved);
        if (isOfFile && placeOf(URL::fileURL(*event.path)) == Place::visible) {
            paths.push_back(*event.path);
        }
    }
    if (paths.size() > 1) {
        (void)platform_.generationStore.allocatePermanentStorage(paths);
    }
}

// Runs of the reader follow each other on one queue, so no two of these meet.
void FSEventReader::countAsProcessed(EventID eventID) {
    if (eventID > lastProcessedFSEventID_.load()) {
        lastProcessedFSEventID_ = eventID;
    }
}

bool FSEventReader::handle(const Run& run, FSEventReaderDelegate& delegate,
                           const FileEvent& event) {
    if (says(event, FileEventFlag::eventIDsWrapped)) {
        if (verbose_) {
            platform_.log.info([] { return "fsevents id wrapped"; });
        }
        delegate.fsEventReaderMustReset();
        return true;
    }
    if (saysDropped(event)) {
        platform_.log.debug([] { return "dropped fsevents"; });
        delegate.fsEventReaderMustReset();
    }
    if (says(event, FileEventFlag::historyDone)) {
        if (run.isStopped) {
            return false;
        }
        logDecision([] { return "done processing history"; });
        delegate.fsEventReaderDidFinishHistory(event.id);
    }
    const bool concernsTheStream = saysDropped(event) || says(event, FileEventFlag::historyDone);
    if (concernsTheStream && !event.path) {
        return true;
    }
    return !run.isStopped && handlePath(run, delegate, event);
}

bool FSEventReader::handlePath(const Run& run, FSEventReaderDelegate& delegate,
                               const FileEvent& event) {
    if (!event.path || event.path->empty()) {
        platform_.log.error("ignore event " + marrowdale::description(event) +
                            " because no path can be extracted");
        return true;
    }
    if (mode_ == FSEventReaderMode::docIDBased && event.path->contains(documentPathMark)) {
        return handleDocumentPath(run, delegate, event);
    }
    // Made anew for each event, so that nothing that was cached for the path is taken for what is
    // there now.
    return handleURL(run, delegate, event, URL::fileURL(*event.path),
                     Comparison::withTheEventsFile);
}

bool FSEventReader::handleDocumentPath(const Run& run, FSEventReaderDelegate& delegate,
                                       const FileEvent& event) {
    DocIDChange change;
    if (!parseDocIDChangePath(*event.path, change)) {
        platform_.log.error("can't parse docID path " + quoted(*event.path) +
                            "; format expected is " + quoted(documentPathFormat));
        return true;
    }
    const auto url = fileURLWithItemIdentifier(
        platform_,
        MRWFileObjectIdentifier::fromDocumentID(static_cast<std::uint64_t>(change.documentID)));
    if (!url) {
        logDecision([&] { return "can't compute url for " + marrowdale::description(change); });
        return true;
    }
    if (isInPackage(*url)) {
        logDecision(
            [&] { return "dropping fsevent at " + url->path() + "; URL is not monitored"; });
        return tellOutOfSight(run, delegate, event, *url);
    }
    return handleURL(run, delegate, event, *url, Comparison::none);
}

// What a package holds is no item, though its documents keep their identifiers.
bool FSEventReader::isInPackage(const URL& url) const {
    const auto isServed = [this](const URL& folder) {
        return std::ranges::any_of(urls_, [&](const URL& root) {
            return relationship(root, folder) == URLRelationship::contains;
        });
    };
    for (URL folder = url.deletingLastPathComponent(); isServed(folder);
         folder = folder.deletingLastPathComponent()) {
        if (!hx_isFolder(platform_, folder)) {
            return true;
        }
    }
    return false;
}

bool FSEventReader::handleURL(const Run& run, FSEventReaderDelegate& delegate,
                              const FileEvent& event, const URL& url, Comparison comparison) {
    switch (placeOf(url)) {
        case Place::hidden:
            logDecision([&] { return "dropping fsevent at " + url.path() + "; URL is hidden"; });
            return tellOutOfSight(run, delegate, event, url);
        case Place::notMonitored:
            logDecision(
                [&] { return "dropping fsevent at " + url.path() + "; URL is not monitored"; });
            return tellOutOfSight(run, delegate, event, url);
        case Place::visible:
            break;
    }
    const Entry entry = entryAt(platform_, url);
    if (!entry.exists) {
        return tellDeletions(run, delegate, event, url);
    }
    const bool isOther = comparison == Comparison::withTheEventsFile && event.fileID &&
                         entry.fileID && *entry.fileID != *event.fileID;
    return handleItem(run, delegate, event, entry.url, isOther ? entry.fileID : std::nullopt);
}

// `otherFile` is the file that stands at the URL, where it is not the event's own.
bool FSEventReader::handleItem(const Run& run, FSEventReaderDelegate& delegate,
                               const FileEvent& event, const URL& url,
                               std::optional<FileID> otherFile) const {
    const auto item = makeItem(platform_, url);
    if (item && !otherFile) {
        logDecision([&] { return "did change " + item->description(); });
        delegate.fsEventReaderDidChangeItem(item, event);
        if (item->isFolder() && isMoveToHere(event) && !tellDocumentAt(run, delegate, event, url)) {
            return false;
        }
        // An identifier that went, from a file that stays under another, or from one whose number
        // the file that stands here was given.
        const bool isIdentifierGone = says(event, FileEventFlag::gone) &&
                                      event.goneDocument != DocumentID{} &&
                                      item->docID != raw(event.goneDocument);
        return !isIdentifierGone ||
               tellDeletion(run, delegate, event, url,
                            MRWFileObjectIdentifier::fromDocumentID(raw(event.goneDocument)));
    }
    logDecision([&] {
        const std::string text = "dropping fsevent at " + url.path();
        return item ? text + "; fileObjectIDs don't match (" + std::to_string(raw(*otherFile)) +
                          " vs " + std::to_string(raw(*event.fileID)) + ")"
                    : text + "; can't create local item";
    });
    // Its own file left this place all the same.
    const bool isGone = otherFile && says(event, FileEventFlag::gone);
    return !isGone || tellDeletions(run, delegate, event, url);
}

// Whoever knows the document need not recognise it in the number of the file that the event of its
// old place has: a link is known with the number of what it leads to, and a document that came to
// rest on another file with that of the one before. A file of several names may be in sight under
// another one, which its number tells as well.
bool FSEventReader::tellOutOfSight(const Run& run, FSEventReaderDelegate& delegate,
                                   const FileEvent& event, const URL& url) {
    if (says(event, FileEventFlag::gone)) {
        return tellGoneOutOfSight(run, delegate, event, url);
    }
    if (!isMoveToHere(event) && !says(event, FileEventFlag::documentMoved)) {
        return true;
    }
    const auto file = platform_.fileSystem.openForEvents(url);
    const auto attributes = file ? platform_.fileSystem.commonAttributes(**file)
                                 : Expected<CommonAttributes>(Unexpected(file.error()));
    if (!attributes || (event.fileID && attributes->fileID != *event.fileID)) {
        untold_.try_emplace(url.path(), false);
    }
    const bool hasOtherNames = attributes && attributes->fileID == event.fileID &&
                               attributes->type != FileType::directory && attributes->linkCount > 1;
    return hasOtherNames || tellDocumentAt(run, delegate, event, url);
}

// What is hidden is nobody's, unless it came there unseen from where it was somebody's.
bool FSEventReader::tellGoneOutOfSight(const Run& run, FSEventReaderDelegate& delegate,
                                       const FileEvent& event, const URL& url) {
    const bool isUntold = isBelowUntold(url.path());
    if (const auto untold = untold_.find(url.path()); untold != untold_.end()) {
        untold->second = true;
    }
    if (!isUntold) {
        return true;
    }
    if (says(event, FileEventFlag::isFolder) && event.fileID) {
        return tellDeletion(run, delegate, event, url,
                            MRWFileObjectIdentifier::fromFileID(raw(*event.fileID)));
    }
    return event.goneDocument == DocumentID{} ||
           tellDeletion(run, delegate, event, url,
                        MRWFileObjectIdentifier::fromDocumentID(raw(event.goneDocument)));
}

bool FSEventReader::isBelowUntold(std::string_view path) const {
    while (!path.empty() && !untold_.contains(path)) {
        path = path.substr(0, path.rfind('/'));
    }
    return !path.empty();
}

// What stands there is no document to anybody any more, though its number stays with it.
bool FSEventReader::tellDocumentAt(const Run& run, FSEventReaderDelegate& delegate,
                                   const FileEvent& event, const URL& url) const {
    const auto document =
        platform_.generationStore.permanentStorageForItemAtURL(url, AllocateIfNone::no);
    return !document || tellDeletion(run, delegate, event, url,
                                     MRWFileObjectIdentifier::fromDocumentID(raw(*document)));
}

bool FSEventReader::tellDeletions(const Run& run, FSEventReaderDelegate& delegate,
                                  const FileEvent& event, const URL& url) const {
    std::vector<std::string> identifiers;
    if (event.fileID) {
        identifiers.push_back(MRWFileObjectIdentifier::fromFileID(raw(*event.fileID)));
    }
    if (event.goneDocument != DocumentID{}) {
        identifiers.push_back(MRWFileObjectIdentifier::fromDocumentID(raw(event.goneDocument)));
    }
    if (identifiers.empty()) {
        logDecision(
            [&] { return "dropping fsevent at " + quoted(url.path()) + "; No object at path"; });
    }
    return std::ranges::all_of(identifiers, [&](const std::string& identifier) {
        return tellDeletion(run, delegate, event, url, identifier);
    });
}

bool FSEventReader::tellDeletion(const Run& run, FSEventReaderDelegate& delegate,
                                 const FileEvent& event, const URL& url,
                                 const std::string& identifier) const {
    if (run.isStopped) {
        return false;
    }
    logDecision([&] { return "did delete " + identifier; });
    delegate.fsEventReaderDidDeleteItem(identifier, url.path(), event);
    return true;
}

// Where monitored folders lie in each other, what is visible below one of them is visible.
FSEventReader::Place FSEventReader::placeOf(const URL& url) const {
    const URL place = url.standardized();
    Place found = Place::notMonitored;
    for (const URL& root : urls_) {
        if (relationship(root, place) == URLRelationship::other) {
            continue;
        }
        if (!isHiddenBelow(root.standardized(), place)) {
            return Place::visible;
        }
        found = Place::hidden;
    }
    return found;
}

}  // namespace marrowdale
