#include "tests/powerloss/CutCheck.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <ranges>
#include <utility>

#include "platform/linux/store/StoreTestSupport.h"
#include "platform/services/FileEventService.h"
#include "platform/testing/TestFiles.h"
#include "tests/powerloss/TreeWriter.h"

namespace marrowdale::tests {

namespace {

constexpr std::size_t mostGone = 20;

std::string text(DocumentID document) {
    return "document " + std::to_string(raw(document));
}

std::string text(EventID event) {
    return "event " + std::to_string(raw(event));
}

std::string text(const FileKey& file) {
    return "file " + std::to_string(raw(file.file)) + " born " + file.birth.rfc3339();
}

// Contents of a folder that was renamed in the tree have no events of their own.
bool isTold(const std::string& path, const std::set<std::string>& told,
            const std::set<std::string>& renamed) {
    if (told.contains(path)) {
        return true;
    }
    for (std::size_t end = path.rfind('/'); end != std::string::npos && end > 0;
         end = path.rfind('/', end - 1)) {
        if (renamed.contains(path.substr(0, end))) {
            return true;
        }
    }
    return false;
}

}  // namespace

CutCheck::CutCheck(std::string disk, Workload workload, const HandedOut& out, std::size_t position)
    : disk_(std::move(disk)),
      root_(disk_ + "/root"),
      workload_(workload),
      out_(out),
      position_(position) {
    gatherDocuments();
    for (const auto& anchor : out_.anchors) {
        if (isBeforeCut(anchor)) {
            lastEvent_ = std::max(lastEvent_, anchor.event);
        }
    }
}

void CutCheck::gatherDocuments() {
    std::set<FileKey> left;
    for (const auto& gone : out_.left) {
        if (isBeforeCut(gone)) {
            left.insert(gone.file);
        }
    }
    for (const auto& given : out_.given) {
        if (isBeforeCut(given)) {
            Document& document = documents_[given.document];
            document.files.insert(given.file);
            document.last = given.file;
            document.name = TreeWriter::isSaved(given.path) ? given.path : "";
            document.mayBeGone = !document.name.empty() || left.contains(given.file);
        }
    }
}

std::vector<std::string> CutCheck::run() {
    if (open()) {
        tree_ = treeBelow(root_);
        checkEvents();
        checkDocuments();
        checkLifeGoesOn();
    }
    store_.reset();
    return std::move(complaints_);
}

bool CutCheck::open() {
    auto opened = native::Store::open(storeOptions(disk_, workload_));
    if (!opened) {
        complain("the store does not open: " + opened.error().description());
        return false;
    }
    store_ = std::move(*opened);
    if (!out_.made || !isBeforeCut(*out_.made)) {
        return true;
    }
    const auto report = store_->report();
    if (report.uuid != out_.made->store) {
        complain("another store: " + report.rebuildReason);
        return false;
    }
    const std::string wrong = report.rebuildReason + report.historyProblem + report.witness +
                              (report.writeError ? report.writeError->description() : "");
    if (!wrong.empty()) {
        complain("the store has a problem: " + wrong);
    }
    return true;
}

void CutCheck::checkDocuments() {
    checkDocumentsOf("");
    for (const auto& [path, state] : tree_) {
        if (state.isFolder) {
            checkDocumentsOf(path);
        }
    }
    for (const auto& [document, files] : owners_) {
        if (files.size() > 1) {
            complain(text(document) + " is that of two files");
        }
    }
    for (const auto& [path, state] : tree_) {
        files_.insert(state.key);
    }
    // Each one that is gone costs a look at the whole tree; the newest are the most in danger.
    std::size_t gone = 0;
    for (const auto& [document, known] : documents_ | std::views::reverse) {
        gone += owners_.contains(document) ? 0U : 1U;
        if (owners_.contains(document) || files_.contains(known.last) || gone < mostGone) {
            checkResolution(document, known);
        }
    }
}

void CutCheck::checkDocumentsOf(const std::string& folder) {
    auto asked = native::makeRequests(folder.empty() ? root_ : root_ + "/" + folder);
    if (const auto done = store_->assignDocumentIDs(asked.requests); !done) {
        complain("documents are refused: " + done.error().description());
        return;
    }
    const std::string below = folder.empty() ? "" : folder + "/";
    for (const auto& request : asked.requests) {
        const std::string name(request.name);
        if (request.document != DocumentID{}) {
            checkOwner(request.document, below + name,
                       {request.status.fileID, request.status.birth});
        }
    }
}

void CutCheck::checkOwner(DocumentID document, const std::string& path, const FileKey& file) {
    owners_[document].insert(file);
    const auto known = documents_.find(document);
    if (known != documents_.end() && !known->second.files.contains(file) &&
        known->second.name != path) {
        complain(text(document) + " was handed out for " + text(known->second.last) +
                 " and is that of " + path + " now, " + text(file));
    }
}

void CutCheck::checkResolution(DocumentID document, const Document& known) {
    const auto resolved = store_->resolveDocumentID(document, store_->device());
    const bool isOwned = owners_.contains(document);
    if (!resolved && resolved.error().code != ENOENT) {
        complain(text(document) + " fails: " + resolved.error().description());
    }
    if (resolved.has_value() != isOwned ||
        (isOwned && *resolved != owners_.at(document).begin()->file)) {
        complain(text(document) + " resolves to something else than the file that has it");
    }
    if (files_.contains(known.last) && !known.mayBeGone &&
        !(isOwned && owners_.at(document).contains(known.last))) {
        complain(text(document) + " does not lead to its file any more, " + text(known.last));
    }
    documentsFound_ += isOwned ? 1 : 0;
}

CutCheck::Events CutCheck::eventsSince(EventID since) {
    Events events;
    auto cursor = store_->eventsSince(since);
    if (!cursor) {
        complain("no events since " + text(since) + ": " + cursor.error().description());
        return events;
    }
    while (true) {
        const auto event = (*cursor)->next();
        if (!event) {
            complain("the history ends early: " + event.error().description());
            return events;
        }
        if (!*event) {
            return events;
        }
        const bool isNew = events
                               .emplace((*event)->id, Happened{std::string((*event)->path),
                                                               (*event)->flags, describe(**event)})
                               .second;
        if (!isNew) {
            complain(text((*event)->id) + " is told twice");
        }
    }
}

// Only where little history is kept.
bool CutCheck::isPruned(EventID event) {
    return workload_ == Workload::snapshots &&
           store_->standingOf(event) == native::EventHistory::Standing::pruned;
}

void CutCheck::checkEvents() {
    const EventID oldest = store_->report().oldestEventID;
    if (workload_ == Workload::ordinary && oldest > EventID{1}) {
        complain("the history begins with " + text(oldest));
    }
    const Events all = eventsSince(EventID{raw(oldest) - 1});
    std::map<EventID, std::string> recorded;
    for (const auto& told : out_.told) {
        recorded.emplace(told.event, told.text);
        if (isBeforeCut(told) && told.event >= oldest && !all.contains(told.event)) {
            complain(text(told.event) + " is gone: " + told.text);
        }
    }
    for (const auto& [event, happened] : all) {
        const auto known = recorded.find(event);
        const bool isOther = known == recorded.end() ? workload_ == Workload::ordinary
                                                     : known->second != happened.text;
        if (event <= lastEvent_ && isOther) {
            complain(text(event) + " became another: " + happened.text);
        }
    }
    for (const auto& anchor : out_.anchors) {
        if (isBeforeCut(anchor)) {
            checkAnchor(anchor);
        }
    }
}

void CutCheck::checkAnchor(const HandedOut::Anchor& anchor) {
    if (isPruned(anchor.event)) {
        return;
    }
    // It was synced before it was handed out, so it must not even be told as lost.
    if (store_->standingOf(anchor.event) != native::EventHistory::Standing::good) {
        complain(text(anchor.event) + " is no good anchor any more");
        return;
    }
    std::set<std::string> told;
    std::set<std::string> renamed;
    for (const auto& [event, happened] : eventsSince(anchor.event)) {
        told.insert(happened.path);
        if ((happened.flags & FileEventFlag::renamed) != 0) {
            renamed.insert(happened.path);
        }
    }
    std::set<std::string> paths;
    std::ranges::transform(anchor.tree, std::inserter(paths, paths.end()),
                           [](const auto& entry) { return entry.first; });
    std::ranges::transform(tree_, std::inserter(paths, paths.end()),
                           [](const auto& entry) { return entry.first; });
    for (const std::string& path : paths) {
        const auto before = anchor.tree.find(path);
        const auto now = tree_.find(path);
        const bool isSame =
            before != anchor.tree.end() && now != tree_.end() && before->second == now->second;
        differences_ += isSame ? 0 : 1;
        if (!isSame && !isTold(path, told, renamed)) {
            complain("no event since " + text(anchor.event) + " tells of " + path + ": " +
                     (before == anchor.tree.end() ? "nothing" : describe(before->second)) +
                     " became " + (now == tree_.end() ? "nothing" : describe(now->second)));
        }
    }
}

void CutCheck::checkLifeGoesOn() {
    writeFile(root_ + "/after", "the power is back");
    const auto done = store_->reconcile();
    const auto event = store_->barrier();
    if (!done || !event) {
        complain("nothing can be recorded: " + (done ? event.error() : done.error()).description());
    } else if (*event <= lastEvent_) {
        complain(text(*event) + " is not later than what was handed out before");
    }
    checkDocumentsOf("");
}

}  // namespace marrowdale::tests
