#include "platform/linux/store/TreeChanges.h"

#include <algorithm>
#include <ranges>
#include <utility>

#include "platform/services/FileEventService.h"

namespace marrowdale::native {

namespace {

constexpr std::uint32_t touchedBits =
    Row::touchedAppeared | Row::touchedChanged | Row::touchedRenamed;

std::string joined(const std::string& folder, std::string_view name) {
    std::string path = folder;
    if (!path.empty()) {
        path += '/';
    }
    path += name;
    return path;
}

}  // namespace

void TreeChanges::touch(RowNumber number, std::uint32_t bits) {
    if (silent_) {
        return;
    }
    Row& row = index_.row(number);
    if (!row.has(touchedBits)) {
        touched_.push_back(number);
    }
    row.set(bits, true);
}

bool TreeChanges::isPackage(RowNumber number) const {
    return number != rootRow && index_.row(number).isFolder() &&
           packages_.isPackageName(index_.name(number));
}

std::uint32_t TreeChanges::kindFlags(RowNumber number) const {
    return index_.row(number).isFolder() && !isPackage(number) ? FileEventFlag::isFolder : 0;
}

TreeChanges::Place TreeChanges::placeOf(RowNumber number) const {
    Place place;
    std::vector<std::string_view> parts;
    for (RowNumber up = number; up != rootRow && up != noRow; up = index_.row(up).parent) {
        if (up != number && isPackage(up)) {
            place.package = up;
        }
        const auto left = index_.row(up).has(Row::limbo) ? left_.find(up) : left_.end();
        if (left != left_.end()) {
            const Place& from = left->second.place;
            place.package = from.package != noRow ? from.package : place.package;
            place.path = from.path;
            break;
        }
        parts.push_back(index_.name(up));
    }
    for (const std::string_view part : std::views::reverse(parts)) {
        place.path = joined(place.path, part);
    }
    return place;
}

void TreeChanges::documentMoved(DeviceID device, std::uint32_t document, std::uint64_t from,
                                std::uint64_t to) {
    if (silent_) {
        return;
    }
    const std::string path = "/.docid/" + std::to_string(raw(device)) + "/changed/" +
                             std::to_string(document) + "/src=" + std::to_string(from) +
                             ",dst=" + std::to_string(to);
    rest_.add({.flags = FileEventFlag::documentMoved, .fileID = FileID{to}, .path = path});
}

void TreeChanges::documentGone(RowNumber number, std::uint32_t document) {
    if (silent_) {
        return;
    }
    const auto moved = moved_.find(number);
    if (moved != moved_.end() && moved->second.goneDocument == 0 &&
        moved->second.from.package == noRow) {
        moved->second.goneDocument = document;
    } else {
        goneDocuments_.push_back({number, document});
    }
}

void TreeChanges::leave(RowNumber number) {
    const Row& row = index_.row(number);
    const FileID folder{index_.row(row.parent).fileID};
    if (row.document != 0) {
        departures_.push_back({row.document, FileID{row.fileID}, row.birth, row.fingerprint,
                               row.isFolder(), folder, std::string(index_.name(number)),
                               index_.attributes(number)});
    }
    left_.insert_or_assign(number, Left{placeOf(number), folder, isPackage(number)});
    index_.putInLimbo(number);
}

bool TreeChanges::arrive(RowNumber number, RowNumber folder, std::string_view name) {
    const std::string fromName(index_.name(number));
    if (!index_.place(number, folder, name)) {
        return false;
    }
    const auto left = left_.find(number);
    if (left == left_.end()) {
        // It went before the run that began with it in limbo: where from is not known any more.
        appeared(number);
        return true;
    }
    arrivals_.push_back(
        {FileID{index_.row(folder).fileID}, std::string(name), left->second.folder, fromName});
    if (!silent_) {
        moved_.try_emplace(number,
                           Moved{std::move(left->second.place), left->second.wasPackage, 0});
        touch(number, Row::touchedRenamed);
    }
    left_.erase(left);
    return true;
}

std::uint32_t TreeChanges::takeDocument(RowNumber number) {
    const std::uint32_t document = index_.row(number).document;
    if (document == 0) {
        return 0;
    }
    index_.setDocument(number, 0);
    return index_.rowsOfDocument(document).empty() ? document : 0;
}

void TreeChanges::putGone(RowNumber number, const std::string& path, std::uint32_t flags,
                          std::uint32_t document) {
    gone_.add({.id = {},
               .flags = FileEventFlag::gone | flags,
               .fileID = FileID{index_.row(number).fileID},
               .goneDocument = DocumentID{document},
               .path = path});
}

bool TreeChanges::hasServedName(std::uint32_t document) const {
    return std::ranges::any_of(index_.rowsOfDocument(document), [&](RowNumber number) {
        return !index_.row(number).has(Row::limbo) && placeOf(number).package == noRow;
    });
}

void TreeChanges::noteOtherNames(RowNumber number) {
    const Row& row = index_.row(number);
    if (!row.has(Row::severalLinks)) {
        return;
    }
    for (const RowNumber other : index_.rowsOfFile(row.fileID)) {
        const Row& otherRow = index_.row(other);
        if (other != number && otherRow.birth == row.birth &&
            otherRow.fingerprint == row.fingerprint) {
            otherNames_.push_back(other);
        }
    }
}

// `forgets`: the rows are about to be freed, so their documents are gone with them.
void TreeChanges::putBelow(RowNumber folder, const std::string& path, Side side, bool forgets) {
    std::vector<std::pair<RowNumber, std::string>> left{{folder, path}};
    while (!left.empty()) {
        const auto [above, abovePath] = std::move(left.back());
        left.pop_back();
        for (RowNumber below = index_.row(above).firstChild(); below != noRow;
             below = index_.row(below).next) {
            std::string belowPath = joined(abovePath, index_.name(below));
            if (side == Side::gone) {
                std::uint32_t document = forgets ? takeDocument(below) : index_.row(below).document;
                if (!forgets && document != 0 && hasServedName(document)) {
                    document = 0;
                }
                putGone(below, belowPath, kindFlags(below), document);
                noteOtherNames(below);
            } else {
                rest_.add({.flags = FileEventFlag::appeared | kindFlags(below),
                           .fileID = FileID{index_.row(below).fileID},
                           .path = belowPath});
            }
            if (index_.row(below).isFolder() && !isPackage(below)) {
                left.emplace_back(below, std::move(belowPath));
            }
        }
    }
}

void TreeChanges::remove(RowNumber number) {
    const auto left = left_.find(number);
    const Place place = left != left_.end() ? left->second.place : placeOf(number);
    const bool wasPackage = left != left_.end() ? left->second.wasPackage : isPackage(number);
    // One that moved before it went: the place where it was told of last is the first of them.
    const auto moved = moved_.find(number);
    const Place& last = moved != moved_.end() ? moved->second.from : place;
    if (silent_) {
        // Nobody was told of it.
    } else if (last.package != noRow) {
        packagesChanged_.push_back(last.package);
    } else {
        const std::uint32_t document = takeDocument(number);
        putGone(number, last.path, wasPackage ? 0 : kindFlags(number), document);
        if (index_.row(number).isFolder() && !wasPackage) {
            putBelow(number, last.path, Side::gone, true);
        }
    }
    if (left != left_.end()) {
        left_.erase(left);
    }
    moved_.erase(number);
    noteRemovedFolders(number);
    index_.remove(number);
}

std::vector<FileID> TreeChanges::takeRemovedFolders() {
    return std::exchange(removedFolders_, {});
}

void TreeChanges::noteRemovedFolders(RowNumber number) {
    std::vector<RowNumber> left{number};
    while (!left.empty()) {
        const Row& row = index_.row(left.back());
        left.pop_back();
        if (!row.isFolder()) {
            continue;
        }
        removedFolders_.emplace_back(FileID{row.fileID});
        for (RowNumber below = row.firstChild(); below != noRow; below = index_.row(below).next) {
            left.push_back(below);
        }
    }
}

std::vector<TreeChanges::Departure> TreeChanges::takeDepartures() {
    return std::exchange(departures_, {});
}

std::vector<TreeChanges::Arrival> TreeChanges::takeArrivals() {
    return std::exchange(arrivals_, {});
}

bool TreeChanges::hasChanges() const {
    return !touched_.empty() || !gone_.empty() || !rest_.empty() || !goneDocuments_.empty() ||
           !packagesChanged_.empty();
}

void TreeChanges::flush(EventBatch& batch) {
    std::vector<RowNumber> waiting;
    for (const RowNumber number : touched_) {
        Row& row = index_.row(number);
        const std::uint32_t bits = row.flags & touchedBits;
        if (row.isFree() || bits == 0) {
            continue;
        }
        if (row.has(Row::limbo)) {
            waiting.push_back(number);
            continue;
        }
        row.set(touchedBits, false);
        flushRow(number, bits);
    }
    touched_ = std::move(waiting);
    flushGoneDocuments();
    flushPackages();
    flushOtherNames();
    const auto add = [&batch](const StoredEvent& event) { batch.add(event); };
    gone_.forEach(add);
    rest_.forEach(add);
    gone_.clear();
    rest_.clear();
}

void TreeChanges::flushRow(RowNumber number, std::uint32_t bits) {
    const Place now = placeOf(number);
    const auto moved = moved_.find(number);
    if (moved != moved_.end()) {
        flushMove(number, moved->second, now);
        moved_.erase(moved);
        return;
    }
    if (now.package != noRow) {
        packagesChanged_.push_back(now.package);
        return;
    }
    const bool isNew = (bits & Row::touchedAppeared) != 0;
    rest_.add(
        {.flags = (isNew ? FileEventFlag::appeared : FileEventFlag::changed) | kindFlags(number),
         .fileID = FileID{index_.row(number).fileID},
         .path = now.path});
}

// Two events, and more where what lies below comes to be served, or is served no longer: a folder
// that became a package, or came out of one.
void TreeChanges::flushMove(RowNumber number, const Moved& moved, const Place& now) {
    const bool isFolder = index_.row(number).isFolder();
    const bool wasOpen = isFolder && !moved.wasPackage && moved.from.package == noRow;
    const bool isOpen = isFolder && !isPackage(number) && now.package == noRow;
    if (moved.from.package != noRow) {
        packagesChanged_.push_back(moved.from.package);
    } else if (moved.from.path != now.path) {
        putGone(number, moved.from.path,
                FileEventFlag::renamed | (wasOpen ? FileEventFlag::isFolder : 0),
                moved.goneDocument);
    } else if (moved.goneDocument != 0) {
        goneDocuments_.push_back({number, moved.goneDocument});
    }
    if (wasOpen && !isOpen) {
        putBelow(number, moved.from.path, Side::gone, false);
    }
    if (now.package != noRow) {
        packagesChanged_.push_back(now.package);
        return;
    }
    const bool cameIn = moved.from.package != noRow;
    rest_.add(
        {.flags = (cameIn ? FileEventFlag::appeared : FileEventFlag::renamed) | kindFlags(number),
         .fileID = FileID{index_.row(number).fileID},
         .path = now.path});
    if (isOpen && !wasOpen) {
        putBelow(number, now.path, Side::appeared, false);
    }
}

void TreeChanges::flushGoneDocuments() {
    for (const GoneDocument& gone : goneDocuments_) {
        if (!index_.row(gone.row).isFree()) {
            const Place place = placeOf(gone.row);
            // Without a file: it is there, under another identifier.
            gone_.add({.id = {},
                       .flags = FileEventFlag::gone,
                       .fileID = {},
                       .goneDocument = DocumentID{gone.document},
                       .path = place.path});
        }
    }
    goneDocuments_.clear();
}

void TreeChanges::flushOtherNames() {
    std::ranges::sort(otherNames_);
    const auto repeated = std::ranges::unique(otherNames_);
    otherNames_.erase(repeated.begin(), repeated.end());
    for (const RowNumber number : otherNames_) {
        if (index_.row(number).isFree() || index_.row(number).has(Row::limbo)) {
            continue;
        }
        const Place place = placeOf(number);
        if (place.package == noRow) {
            rest_.add({.flags = FileEventFlag::changed | kindFlags(number),
                       .fileID = FileID{index_.row(number).fileID},
                       .path = place.path});
        }
    }
    otherNames_.clear();
}

void TreeChanges::flushPackages() {
    std::ranges::sort(packagesChanged_);
    const auto repeated = std::ranges::unique(packagesChanged_);
    packagesChanged_.erase(repeated.begin(), repeated.end());
    for (const RowNumber number : packagesChanged_) {
        if (!index_.row(number).isFree() && !index_.row(number).has(Row::limbo)) {
            rest_.add({.flags = FileEventFlag::changed,
                       .fileID = FileID{index_.row(number).fileID},
                       .path = placeOf(number).path});
        }
    }
    packagesChanged_.clear();
}

}  // namespace marrowdale::native
