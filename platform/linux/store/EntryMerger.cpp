#include "platform/linux/store/EntryMerger.h"

#include <algorithm>
#include <limits>

namespace marrowdale::native {

namespace {

// A change within the file system's clock tick of an earlier look may not show in the ctime.
constexpr std::int64_t unsureNanoseconds = 10'000'000;

bool isUnsure(const Date& changed, const Date& lookedAt) {
    const std::int64_t seconds = lookedAt.seconds - changed.seconds;
    if (seconds > 1) {
        return false;
    }
    // The future is unsure too: clocks are set back.
    return seconds < 0 || seconds * 1'000'000'000 + lookedAt.nanoseconds -
                                  static_cast<std::int64_t>(changed.nanoseconds) <
                              unsureNanoseconds;
}

}  // namespace

bool EntryMerger::isUnchanged(const Row& row, const EntryStatus& status) {
    // A power cut may take back what was written and leave the time of it.
    const bool sameSize = row.isFolder() || row.size == status.size;
    return row.fileID == raw(status.fileID) && row.changed == rowTime(status.changed) && sameSize &&
           !row.has(Row::unsure) && row.birth == rowBirth(status) && row.kind() == rowKind(status);
}

bool EntryMerger::isSameFile(const Row& row, const EntryLook& look, bool samePlace) {
    if (row.fileID != raw(look.status.fileID) || row.kind() != rowKind(look.status)) {
        return false;
    }
    const std::int64_t birth = rowBirth(look.status);
    const bool bothBirths = row.birth != 0 && birth != 0;
    const bool bothHandles = row.fingerprint != 0 && look.fingerprint != 0;
    if ((bothBirths && row.birth != birth) ||
        (bothHandles && row.fingerprint != look.fingerprint)) {
        return false;
    }
    return bothBirths || bothHandles || samePlace;
}

Row EntryMerger::valuesOf(const EntryLook& look) {
    Row values{};
    values.fileID = raw(look.status.fileID);
    values.birth = rowBirth(look.status);
    values.changed = rowTime(look.status.changed);
    values.size = look.status.isDirectory() ? 0 : look.status.size;
    values.fingerprint = look.fingerprint;
    values.flags = static_cast<std::uint32_t>(rowKind(look.status));
    values.set(Row::unsure, isUnsure(look.status.changed, look.lookedAt));
    values.set(Row::severalLinks, !look.status.isDirectory() && look.status.linkCount > 1);
    return values;
}

RowNumber EntryMerger::unchangedRow(RowNumber folder, std::string_view name,
                                    const EntryStatus& status, RowNumber guess) const {
    RowNumber found = guess;
    if (guess == noRow || index_.row(guess).parent != folder || index_.name(guess) != name) {
        found = index_.child(folder, name);
    }
    return found != noRow && isUnchanged(index_.row(found), status) ? found : noRow;
}

EntryMerger::Kin EntryMerger::findKin(const EntryLook& look, RowNumber except) const {
    Kin kin;
    for (const RowNumber number : index_.rowsOfFile(raw(look.status.fileID))) {
        const Row& row = index_.row(number);
        if (number == except || !isSameFile(row, look, false)) {
            continue;
        }
        kin.nextAge = std::max(kin.nextAge, row.age() + 1);
        kin.document = row.document != 0 ? row.document : kin.document;
        if (kin.row == noRow || row.has(Row::limbo)) {
            kin.row = number;
        }
    }
    return kin;
}

void EntryMerger::refresh(RowNumber number, const EntryLook& look) {
    const Row& row = index_.row(number);
    Row values = valuesOf(look);
    values.setAge(row.age());
    values.set(Row::unreadable, row.has(Row::unreadable));
    values.fingerprint = look.fingerprint != 0 ? look.fingerprint : row.fingerprint;
    if (look.attributes) {
        index_.setAttributes(number, *look.attributes);
    }
    const bool sameSize = row.isFolder() || row.size == values.size;
    const bool sameTime = row.changed == values.changed && !row.has(Row::unsure);
    // A folder's time moves with every change in it, which is told of what changed there.
    if (!row.isFolder() && (!sameSize || !sameTime)) {
        changes_.changed(number);
    }
    if (row.changed != values.changed || row.fingerprint != values.fingerprint || !sameSize ||
        (row.flags & Row::lastingFlags) != values.flags) {
        index_.update(number, values);
    }
}

bool EntryMerger::confirm(RowNumber number, const EntryLook& look) {
    Row& row = index_.row(number);
    if (row.isFree() || row.has(Row::limbo) || !isSameFile(row, look, true)) {
        return false;
    }
    const Row values = valuesOf(look);
    if (row.changed != values.changed || (!row.isFolder() && row.size != values.size)) {
        return false;
    }
    if (row.has(Row::unsure) != values.has(Row::unsure)) {
        row.set(Row::unsure, values.has(Row::unsure));
        index_.markDirty(number);
    }
    return true;
}

void EntryMerger::makeSure(RowNumber number, const EntryLook& look) {
    const Row& row = index_.row(number);
    if (row.isFree() || row.has(Row::limbo) || !isSameFile(row, look, true)) {
        return;  // the next look finds what became of it
    }
    if (!confirm(number, look)) {
        refresh(number, look);
    }
}

void EntryMerger::noteAbsent(RowNumber folder, std::string_view name) {
    const RowNumber known = index_.child(folder, name);
    if (known != noRow) {
        changes_.leave(known);
    }
}

void EntryMerger::noteFolderDigest(RowNumber folder, std::uint32_t digest) {
    Row& row = index_.row(folder);
    if (row.attributes == digest) {
        return;
    }
    if (row.attributes != 0) {
        changes_.changed(folder);
    }
    row.attributes = digest;
    index_.markDirty(folder);
}

// Nothing is told of a file's other names when it gets one more.
void EntryMerger::refreshOtherNames(RowNumber number, const EntryLook& look) {
    for (const RowNumber other : index_.rowsOfFile(raw(look.status.fileID))) {
        const Row& row = index_.row(other);
        if (other != number && !row.has(Row::limbo) && isSameFile(row, look, false)) {
            refresh(other, look);
        }
    }
}

bool EntryMerger::isEarlierFile(const Row& row, const EntryLook& look) {
    const std::int64_t birth = rowBirth(look.status);
    const bool otherBirth = row.birth != 0 && birth != 0 && row.birth != birth;
    const bool otherHandle =
        row.fingerprint != 0 && look.fingerprint != 0 && row.fingerprint != look.fingerprint;
    return otherBirth || otherHandle || row.kind() != rowKind(look.status);
}

// Its number is another file's now, so it is nowhere any more; and that must be told no later than
// of the other file, for deletions are told by the number.
void EntryMerger::leaveEarlier(const EntryLook& look) {
    for (const RowNumber number : index_.rowsOfFile(raw(look.status.fileID))) {
        const Row& row = index_.row(number);
        if (!index_.isRoot(number) && !row.has(Row::limbo) && isEarlierFile(row, look)) {
            changes_.leave(number);
        }
    }
}

RowNumber EntryMerger::addName(RowNumber folder, std::string_view name, const EntryLook& look,
                               const Kin& kin) {
    Row values = valuesOf(look);
    values.setAge(kin.nextAge);
    const RowNumber added = index_.add(folder, name, values);
    if (added == noRow) {
        return noRow;
    }
    changes_.appeared(added);
    if (look.attributes) {
        index_.setAttributes(added, *look.attributes);
    }
    if (kin.row != noRow) {
        refreshOtherNames(added, look);
    }
    if (kin.document != 0) {
        index_.setDocument(added, kin.document);
    } else {
        saves_.revive(added);
    }
    return added;
}

RowNumber EntryMerger::merge(RowNumber folder, std::string_view name, const EntryLook& look) {
    const RowNumber current = index_.child(folder, name);
    if (current != noRow && isSameFile(index_.row(current), look, true)) {
        refresh(current, look);
        return current;
    }
    const Kin kin = findKin(look, current);
    if (kin.row != noRow && look.status.isDirectory() && index_.isWithin(folder, kin.row)) {
        return noRow;
    }
    if (kin.row != noRow && index_.isLibrary(kin.row) && !index_.row(kin.row).has(Row::limbo)) {
        changes_.leave(kin.row);  // it is an ordinary folder now
    }
    if (current != noRow) {
        changes_.leave(current);
    }
    leaveEarlier(look);
    const bool isInLimbo = kin.row != noRow && index_.row(kin.row).has(Row::limbo);
    const bool hasOneName = look.status.isDirectory() || look.status.linkCount <= 1;
    if (kin.row == noRow || index_.isRoot(kin.row) || (!isInLimbo && !hasOneName)) {
        return addName(folder, name, look, kin);
    }
    if (!isInLimbo) {
        changes_.leave(kin.row);
    }
    if (!changes_.arrive(kin.row, folder, name)) {
        return noRow;
    }
    refresh(kin.row, look);
    return kin.row;
}

}  // namespace marrowdale::native
