#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "platform/foundation/Date.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/store/CarriedAttributes.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/SafeSaves.h"
#include "platform/linux/store/TreeChanges.h"

namespace marrowdale::native {

// One entry as it was found on disk.
struct EntryLook {
    EntryStatus status;
    std::uint32_t fingerprint = 0;  // of the kernel's file handle; 0 for none
    Date lookedAt;                  // before the status was read
    std::optional<CarriedAttributes> attributes = std::nullopt;  // where they were read
};

// Brings the index to what was found at one (folder, name). The one piece of code for that,
// whoever looked: the reconcile or a request. Judges which file is the same as before, so that
// document identifiers go with the file and never to another one that got its inode number. One
// thread at a time, as the index.
class EntryMerger {
  public:
    // What it finds is told to `changes` and `saves`.
    EntryMerger(Index& index, TreeChanges& changes, SafeSaves& saves)
        : index_(index), changes_(changes), saves_(saves) {}

    // The row at (folder, name) when the status alone shows that it still is what it was; else
    // noRow, and the entry must be looked at with its fingerprint and merged. `guess` may name a
    // row that is probably the one.
    [[nodiscard]] RowNumber unchangedRow(RowNumber folder, std::string_view name,
                                         const EntryStatus& status, RowNumber guess = noRow) const;

    // The row that stands for the entry now. What stood at that name and is another file goes to
    // limbo; what stood elsewhere and is this file is moved here. noRow when it can't be placed
    // (the folder is below it in the index, because folders are being moved about; or the index is
    // full).
    [[nodiscard]] RowNumber merge(RowNumber folder, std::string_view name, const EntryLook& look);
    // Nothing stands at that name.
    void noteAbsent(RowNumber folder, std::string_view name);
    // What a folder's own metadata are now (folderDigest).
    void noteFolderDigest(RowNumber folder, std::uint32_t digest);

    // The file of that row was changed, as this look shows.
    void noteChanged(RowNumber number, const EntryLook& look) { refresh(number, look); }
    // True when the row's file is the one that was found and shows no change: then a row that was
    // unsure is as sure as this look. For looks that nobody was told to make; where a watcher tells
    // of a change, a time that is the same proves nothing.
    [[nodiscard]] bool confirm(RowNumber number, const EntryLook& look);
    // A second look, when enough time has passed to be sure of the first.
    void makeSure(RowNumber number, const EntryLook& look);

    // Whether the row's file is the one that was found. `samePlace`: it stood at the very name,
    // which is enough where the file system has neither birth times nor handles.
    [[nodiscard]] static bool isSameFile(const Row& row, const EntryLook& look, bool samePlace);
    // Whether the status shows that nothing at all changed.
    [[nodiscard]] static bool isUnchanged(const Row& row, const EntryStatus& status);
    // A row's values for what was found.
    [[nodiscard]] static Row valuesOf(const EntryLook& look);

  private:
    struct Kin {
        RowNumber row = noRow;  // of the same file; one in limbo where there is one
        std::uint32_t nextAge = 0;
        std::uint32_t document = 0;
    };
    [[nodiscard]] Kin findKin(const EntryLook& look, RowNumber except) const;
    // Whether the row's file had the number before the file that was found.
    [[nodiscard]] static bool isEarlierFile(const Row& row, const EntryLook& look);
    void leaveEarlier(const EntryLook& look);
    void refresh(RowNumber number, const EntryLook& look);
    void refreshOtherNames(RowNumber number, const EntryLook& look);
    [[nodiscard]] RowNumber addName(RowNumber folder, std::string_view name, const EntryLook& look,
                                    const Kin& kin);

    Index& index_;
    TreeChanges& changes_;
    SafeSaves& saves_;
};

}  // namespace marrowdale::native
