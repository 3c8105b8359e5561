#include "platform/linux/store/TreeChanges.h"

#include <algorithm>
#include <ranges>
#include <utility>

#include "platform/services/FileEventService.h"

namespace marrowdale::native {

namespace {

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
    if (!row.has(Row::touched)) {
        touched_.push_back(number);
    }
    row.set(bits, true);
}

void TreeChanges::appearedWithAllBelow(RowNumber folder) {
    std::vector<RowNumber> left{folder};
    while (!left.empty()) {
        const RowNumber next = left.back();
        left.pop_back();
        appeared(next);
        if (!index_.row(next).isFolder()) {
            continue;
        }
        for (RowNumber below = index_.row(next).firstChild(); below != noRow;
             below = index_.row(below).next) {
            left.push_back(below);
        }
    }
}

bool TreeChanges::isPackage(RowNumber number) const {
    return !index_.isRoot(number) && index_.row(number).isFolder() &&
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
            const Place& from = left->second.told.place;
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

TreeChanges::Place TreeChanges::toldPlaceOf(RowNumber number) const {
    Place place;
    std::vector<std::string_view> parts;
    for (RowNumber up = number; up != rootRow && up != noRow; up = index_.row(up).parent) {
        const auto moved = moved_.find(up);
        const auto left = left_.find(up);
        const bool isMoved = moved != moved_.end();
        const bool isPlaced = !isMoved && left == left_.end();
        const bool wasPackage = isMoved    ? moved->second.wasPackage
                                : isPlaced ? isPackage(up)
                                           : left->second.told.wasPackage;
        if (up != number && wasPackage) {
            place.package = up;
        }
        if (!isPlaced) {
            const Place& from = isMoved ? moved->second.place : left->second.told.place;
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
    if (moved != moved_.end() && moved->second.goneDocument == 0 && !moved->second.isGone &&
        moved->second.place.package == noRow) {
        moved->second.goneDocument = document;
    }
    // At the old place and the new, and under each name: one of them may be hidden from whoever
    // knows another.
    for (const RowNumber name : index_.rowsOfFile(index_.row(number).fileID)) {
        if (name == number || areOneFile(index_.row(name), index_.row(number))) {
            goneDocuments_.push_back({name, document});
        }
    }
}

void TreeChanges::documentLeft(RowNumber number, std::uint32_t document) {
    if (!silent_) {
        goneDocuments_.push_back({number, document});
    }
}

void TreeChanges::leave(RowNumber number) {
    const FileID folder{index_.row(index_.row(number).parent).fileID};
    noteDeparture(number, folder);
    Told told{.place = toldPlaceOf(number), .wasPackage = isPackage(number)};
    if (const auto moved = moved_.extract(number)) {
        told = std::move(moved.mapped());  // the place where it was told of last
    }
    left_.insert_or_assign(number, Left{.told = std::move(told), .folder = folder});
    index_.putInLimbo(number);
}

bool TreeChanges::arrive(RowNumber number, RowNumber folder, std::string_view name) {
    const std::string fromName(index_.name(number));
    if (!index_.place(number, folder, name)) {
        return false;
    }
    if (auto left = left_.extract(number)) {
        arrivals_.push_back(
            {FileID{index_.row(folder).fileID}, std::string(name), left.mapped().folder, fromName});
        if (!silent_) {
            moved_.insert_or_assign(number, std::move(left.mapped().told));
        }
    }
    // Without: it went before the run that began with it in limbo, and that was told then.
    touch(number, Row::touchedRenamed);
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

// Without a file: it is there, under another identifier, or was told to be gone before.
void TreeChanges::putGoneDocument(const std::string& path, std::uint32_t document) {
    gone_.add({.id = {},
               .flags = FileEventFlag::gone,
               .fileID = {},
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
    if (silent_ || row.isFolder()) {
        return;
    }
    // Whatever the row says of links: it may have been looked at when the others were there no
    // more, or not yet.
    for (const RowNumber other : index_.rowsOfFile(row.fileID)) {
        if (other != number && areOneFile(index_.row(other), row)) {
            otherNames_.push_back(other);
        }
    }
}

void TreeChanges::noteOtherNamesBelow(RowNumber folder) {
    std::vector<RowNumber> left{folder};
    while (!left.empty()) {
        const RowNumber above = left.back();
        left.pop_back();
        for (RowNumber below = index_.row(above).firstChild(); below != noRow;
             below = index_.row(below).next) {
            if (index_.row(below).isFolder()) {
                left.push_back(below);
            } else if (index_.row(below).has(Row::severalLinks)) {
                noteOtherNames(below);
            }
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
            if (side == Side::gone && moved_.contains(below)) {
                // It came there a moment ago, and is known at another place.
                if (forgets) {
                    tellRemoved(below, moved_.extract(below).mapped());
                }
            } else if (side == Side::gone) {
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

void TreeChanges::tellGone(RowNumber number, const Told& told) {
    if (told.place.package != noRow) {
        packagesChanged_.push_back(told.place.package);
        return;
    }
    const bool wasOpen = index_.row(number).isFolder() && !told.wasPackage;
    putGone(number, told.place.path,
            FileEventFlag::renamed | (wasOpen ? FileEventFlag::isFolder : 0), told.goneDocument);
    noteOtherNames(number);
}

void TreeChanges::tellRemoved(RowNumber number, const Told& told) {
    if (told.place.package != noRow) {
        packagesChanged_.push_back(told.place.package);
        return;
    }
    const std::string& path = told.place.path;
    if (told.goneDocument != 0) {
        putGoneDocument(path, told.goneDocument);
    }
    const std::uint32_t document = takeDocument(number);
    if (!told.isGone) {
        putGone(number, path, told.wasPackage ? 0 : kindFlags(number), document);
        noteOtherNames(number);
    } else if (document != 0) {
        putGoneDocument(path, document);
    }
}

void TreeChanges::remove(RowNumber number) {
    Told told;
    if (auto left = left_.extract(number)) {
        told = std::move(left.mapped().told);
    } else {
        // What was in limbo when an earlier run made its last commit was told of then.
        told = {.place = placeOf(number), .wasPackage = isPackage(number), .isGone = true};
    }
    if (!silent_) {
        tellRemoved(number, told);
        const bool wasOpen = index_.row(number).isFolder() && !told.wasPackage;
        if (wasOpen && told.place.package == noRow) {
            putBelow(number, told.place.path, Side::gone, true);
        }
    }
    noteRemoved(number);
    index_.remove(number);
}

std::vector<FileID> TreeChanges::takeRemovedFolders() {
    return std::exchange(removedFolders_, {});
}

void TreeChanges::noteRemoved(RowNumber number) {
    std::vector<RowNumber> left{number};
    while (!left.empty()) {
        const RowNumber next = left.back();
        left.pop_back();
        if (auto moved = moved_.extract(next)) {
            tellRemoved(next, moved.mapped());  // it came into a package, and is known elsewhere
        }
        const Row& row = index_.row(next);
        if (!row.isFolder()) {
            continue;
        }
        removedFolders_.emplace_back(FileID{row.fileID});
        for (RowNumber below = row.firstChild(); below != noRow; below = index_.row(below).next) {
            left.push_back(below);
        }
    }
}

void TreeChanges::noteDeparture(RowNumber number, FileID folder) {
    const Row& row = index_.row(number);
    if (row.document != 0) {
        departures_.push_back({row.document, FileID{row.fileID}, row.birth, row.fingerprint,
                               row.isFolder(), folder, std::string(index_.name(number)),
                               index_.attributes(number)});
    }
}

void TreeChanges::recallDepartures() {
    for (const RowNumber number : index_.limboRows()) {
        if (const RowNumber folder = index_.folderLeft(number); folder != noRow) {
            noteDeparture(number, FileID{index_.row(folder).fileID});
        }
    }
}

std::vector<TreeChanges::Departure> TreeChanges::takeDepartures() {
    return std::exchange(departures_, {});
}

std::vector<TreeChanges::Arrival> TreeChanges::takeArrivals() {
    return std::exchange(arrivals_, {});
}

}  // namespace marrowdale::native
