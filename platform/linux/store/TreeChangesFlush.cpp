// Making events of what was noted, at the end of a batch.

#include <algorithm>
#include <utility>

#include "platform/linux/store/TreeChanges.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

bool TreeChanges::hasChanges() const {
    const bool isLimboUntold =
        std::ranges::any_of(left_, [](const auto& left) { return !left.second.told.isGone; });
    return isLimboUntold || !touched_.empty() || !gone_.empty() || !rest_.empty() ||
           !goneDocuments_.empty() || !packagesChanged_.empty() || !otherNames_.empty();
}

void TreeChanges::flush(EventBatch& batch) {
    flushLimbo();
    flushTouched();
    flushGoneDocuments();
    flushPackages();
    flushOtherNames();
    const auto add = [&batch](const StoredEvent& event) { batch.add(event); };
    gone_.forEach(add);
    rest_.forEach(add);
    gone_.clear();
    rest_.clear();
    told_.clear();
}

void TreeChanges::flushLimbo() {
    for (auto& [number, left] : left_) {
        if (!left.told.isGone && !silent_) {
            tellGone(number, left.told);
            left.told.isGone = true;
            left.told.goneDocument = 0;
        }
    }
}

void TreeChanges::flushTouched() {
    for (const RowNumber number : std::exchange(touched_, {})) {
        Row& row = index_.row(number);
        const std::uint32_t bits = row.flags & Row::touched;
        row.set(Row::touched, false);
        // One in limbo is told of again when it is found.
        if (!row.isFree() && bits != 0 && !row.has(Row::limbo)) {
            flushRow(number, bits);
        }
    }
}

void TreeChanges::flushRow(RowNumber number, std::uint32_t bits) {
    const Place now = placeOf(number);
    const auto moved = moved_.find(number);
    if (moved != moved_.end()) {
        flushMove(number, moved->second, now);
        moved_.erase(moved);
        return;
    }
    const bool isNew = (bits & Row::touchedAppeared) != 0;
    if (!isNew && index_.row(number).has(Row::severalLinks)) {
        noteOtherNames(number);  // the one that it was written under may be out of sight
    }
    if (now.package != noRow) {
        packagesChanged_.push_back(now.package);
        return;
    }
    const bool isBack = (bits & Row::touchedRenamed) != 0;
    told_.push_back(number);
    rest_.add({.flags = (isNew    ? FileEventFlag::appeared
                         : isBack ? FileEventFlag::renamed
                                  : FileEventFlag::changed) |
                        kindFlags(number),
               .fileID = FileID{index_.row(number).fileID},
               .path = now.path});
    if (isBack) {
        noteOtherNames(number);
        noteOtherNamesBelow(number);
    }
}

// Two events, and more where what lies below comes to be served, or is served no longer: a folder
// that became a package, or came out of one.
void TreeChanges::flushMove(RowNumber number, Told told, const Place& now) {
    const bool isFolder = index_.row(number).isFolder();
    // A folder goes by its number. Whoever knows it as a document may hear of that number again
    // before he hears of the document: when he looks, it may stand elsewhere, below a folder that
    // was moved.
    if (isFolder && told.wasPackage && !isPackage(number) && told.goneDocument == 0) {
        told.goneDocument = index_.row(number).document;
    }
    const bool wasOpen = isFolder && !told.wasPackage && told.place.package == noRow;
    const bool isOpen = isFolder && !isPackage(number) && now.package == noRow;
    if (!told.isGone && (told.place.package != noRow || told.place.path != now.path)) {
        tellGone(number, told);
    } else if (told.goneDocument != 0) {
        goneDocuments_.push_back({number, told.goneDocument});
    }
    noteOtherNames(number);
    noteOtherNamesBelow(number);
    if (wasOpen && !isOpen) {
        putBelow(number, told.place.path, Side::gone, false);
    }
    if (now.package != noRow) {
        tellOutOfSight(number, told);
        packagesChanged_.push_back(now.package);
        return;
    }
    const bool cameIn = told.place.package != noRow;
    told_.push_back(number);
    rest_.add(
        {.flags = (cameIn ? FileEventFlag::appeared : FileEventFlag::renamed) | kindFlags(number),
         .fileID = FileID{index_.row(number).fileID},
         .path = now.path});
    if (isOpen && !wasOpen) {
        putBelow(number, now.path, Side::appeared, false);
    }
}

// Nothing is told of what is in a package. Whoever knows the document need not know it by the
// number of its file, which the event of its old place has: a link is known by that of what it
// leads to.
void TreeChanges::tellOutOfSight(RowNumber number, const Told& told) {
    const std::uint32_t document = index_.row(number).document;
    if (told.place.package == noRow && document != 0 && !hasServedName(document)) {
        putGoneDocument(told.place.path, document);
    }
}

void TreeChanges::flushGoneDocuments() {
    std::ranges::sort(goneDocuments_);
    const auto repeated = std::ranges::unique(goneDocuments_);
    goneDocuments_.erase(repeated.begin(), repeated.end());
    for (const GoneDocument& gone : goneDocuments_) {
        if (!index_.row(gone.row).isFree()) {
            Place place = placeOf(gone.row);
            if (place.package != noRow) {
                place = placeOf(place.package);  // what is in it is not told of
            }
            // Without a file: it is there, under another identifier.
            putGoneDocument(place.path, gone.document);
        }
    }
    goneDocuments_.clear();
}

void TreeChanges::flushOtherNames() {
    std::ranges::sort(otherNames_);
    const auto repeated = std::ranges::unique(otherNames_);
    otherNames_.erase(repeated.begin(), repeated.end());
    std::ranges::sort(told_);
    for (const RowNumber number : otherNames_) {
        const Row& row = index_.row(number);
        if (row.isFree() || row.has(Row::limbo) || std::ranges::binary_search(told_, number)) {
            continue;
        }
        const Place place = placeOf(number);
        if (place.package == noRow) {
            rest_.add({.flags = FileEventFlag::changed | kindFlags(number),
                       .fileID = FileID{row.fileID},
                       .path = place.path});
        }
    }
    otherNames_.clear();
}

void TreeChanges::flushPackages() {
    // One may have come to lie in another one.
    std::vector<std::pair<RowNumber, std::string>> packages;
    for (const RowNumber number : std::exchange(packagesChanged_, {})) {
        const Row& row = index_.row(number);
        if (row.isFree() || row.has(Row::limbo)) {
            continue;
        }
        Place place = placeOf(number);
        const RowNumber outer = place.package != noRow ? place.package : number;
        packages.emplace_back(outer, outer == number ? std::move(place.path) : placeOf(outer).path);
    }
    std::ranges::sort(packages);
    const auto repeated = std::ranges::unique(packages);
    packages.erase(repeated.begin(), repeated.end());
    for (const auto& [number, path] : packages) {
        rest_.add({.flags = FileEventFlag::changed | kindFlags(number),
                   .fileID = FileID{index_.row(number).fileID},
                   .path = path});
    }
}

}  // namespace marrowdale::native
