#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "platform/linux/store/CarriedAttributes.h"
#include "platform/linux/store/NameArena.h"
#include "platform/linux/store/Row.h"
#include "platform/linux/store/RowHashTable.h"

namespace marrowdale::native {

// The tree in memory: rows, their names, and tables by (folder, name), by inode number and by
// document. At most 100 bytes an entry. Knows nothing of the disk. One thread at a time.
//
// A row is *placed* when it hangs in its folder's list and in the table of names, and *in limbo*
// when it was taken off and may be placed again; the tables by inode number and document hold it in
// both states. What changes is noted as dirty until `clearDirty`.
class Index {
  public:
    Index();

    [[nodiscard]] const Row& row(RowNumber number) const { return *at(number); }
    // For flags that don't last. Keys (file ID, name, parent, document) change through the calls
    // below alone.
    [[nodiscard]] Row& row(RowNumber number) { return *at(number); }
    [[nodiscard]] std::string_view name(RowNumber number) const {
        return names_.at(row(number).name);
    }

    // Whether the row is a library's: a child of the root, under a name that no file can have, "/"
    // and the library's key. It is no subfolder of the root.
    [[nodiscard]] bool isLibrary(RowNumber number) const { return name(number).starts_with('/'); }
    [[nodiscard]] bool isRoot(RowNumber number) const {
        return number == rootRow || isLibrary(number);
    }

    // Rows that are in use.
    [[nodiscard]] std::size_t count() const { return count_; }
    [[nodiscard]] std::size_t documentCount() const { return byDocument_.count(); }
    [[nodiscard]] std::size_t memory() const;
    // Rows in use or free; numbers end before this.
    [[nodiscard]] RowNumber endOfRows() const { return endOfRows_; }

    [[nodiscard]] RowNumber child(RowNumber folder, std::string_view name) const;
    // The rows, placed or in limbo, that have that inode number or document; mostly one.
    [[nodiscard]] std::vector<RowNumber> rowsOfFile(std::uint64_t fileID) const;
    [[nodiscard]] std::vector<RowNumber> rowsOfDocument(std::uint32_t document) const;
    // The path below the root, without a "/" in front; empty for the root; in a library, "/KEY" and
    // what follows (RecordedRoots). False when the row or a folder above it is in limbo.
    [[nodiscard]] bool path(RowNumber number, std::string& path) const;
    // Whether `number` is `folder` or lies below it.
    [[nodiscard]] bool isWithin(RowNumber number, RowNumber folder) const;

    // A new row without a document, placed in `folder` (noRow: it is the root) or in limbo.
    // `values` gives file ID, birth, changed, size (of a file), fingerprint and flags. noRow when
    // the index is full.
    [[nodiscard]] RowNumber add(RowNumber folder, std::string_view name, const Row& values);
    [[nodiscard]] RowNumber addInLimbo(std::string_view name, const Row& values);
    // Takes a placed row off its folder.
    void putInLimbo(RowNumber number);
    // The folder that a file in limbo was taken off, by this run or the one before; noRow where
    // none is known. Its row may be another folder's by now, where that was freed.
    [[nodiscard]] RowNumber folderLeft(RowNumber number) const;
    // Whether rows are in limbo; and which.
    [[nodiscard]] bool hasLimbo() const;
    [[nodiscard]] std::vector<RowNumber> limboRows() const;
    // Places a row that is in limbo. False when there is no room for the name.
    [[nodiscard]] bool place(RowNumber number, RowNumber folder, std::string_view name);
    // Sets changed, size, fingerprint and the lasting flags of a placed row. The kind must not
    // change.
    void update(RowNumber number, const Row& values);
    void setDocument(RowNumber number, std::uint32_t document);
    // What a file carries for its document; empty for most.
    [[nodiscard]] const CarriedAttributes& attributes(RowNumber number) const;
    void setAttributes(RowNumber number, const CarriedAttributes& attributes);
    // Those of rows that have some, in no order.
    [[nodiscard]] const std::unordered_map<RowNumber, CarriedAttributes>& allAttributes() const {
        return attributes_;
    }
    // Whether the log does not have the dirty row's attributes yet.
    [[nodiscard]] bool hasNewAttributes(RowNumber number) const {
        return newAttributes_.contains(number);
    }
    // Frees the row (in limbo or placed) and all below it.
    void remove(RowNumber number);

    void markDirty(RowNumber number);
    // The rows that were made, changed or freed since `clearDirty`, each once. Those of which more
    // changed than `update` sets have the flag Row::renewed.
    [[nodiscard]] const std::vector<RowNumber>& dirty() const { return dirty_; }
    void clearDirty();

    // Loading: raw rows first, in any order, then everything else is made of them.
    void restoreRow(RowNumber number, const Row& values, std::string_view name);
    // What `update` sets, for a row that was restored before. False when there is none of that
    // kind.
    [[nodiscard]] bool restoreTouch(RowNumber number, const Row& values);
    void freeRestoredRow(RowNumber number);
    // False when there is no such row that could have some.
    [[nodiscard]] bool restoreAttributes(RowNumber number, CarriedAttributes attributes);
    // Room for a chunk's worth of rows that the caller fills, in order from row 0.
    [[nodiscard]] Row* addRawRows(RowNumber count);
    [[nodiscard]] NameArena& names() { return names_; }
    [[nodiscard]] const NameArena& names() const { return names_; }
    // Makes lists and tables. False when the rows are no tree, or two have one place.
    [[nodiscard]] bool finishRestoring();
    // Writes the names anew, without the waste, when it is large.
    void compactNames();

  private:
    static constexpr RowNumber rowsPerChunk = (1U << 20U) / sizeof(Row);

    [[nodiscard]] Row* at(RowNumber number) const {
        return chunks_[number / rowsPerChunk].get() + number % rowsPerChunk;
    }
    [[nodiscard]] std::uint64_t hashOfNumber(std::uint64_t number) const;
    [[nodiscard]] std::uint64_t hashOfName(RowNumber folder, std::string_view name) const;
    [[nodiscard]] RowNumber takeFree();
    void growTo(RowNumber end);
    [[nodiscard]] RowNumber fill(RowNumber folder, std::string_view name, const Row& values);
    void link(RowNumber number);
    void unlink(RowNumber number);
    void insertName(RowNumber number);
    void removeName(RowNumber number);
    void insertFile(RowNumber number);
    void removeFile(RowNumber number);
    void insertDocument(RowNumber number);
    void removeDocument(RowNumber number);
    void freeRow(RowNumber number);
    void markRenewed(RowNumber number);
    [[nodiscard]] bool hasGoodName(RowNumber number) const;
    [[nodiscard]] bool isGoodRow(RowNumber number) const;
    [[nodiscard]] bool linkRestored();
    [[nodiscard]] bool indexRestored();
    [[nodiscard]] std::size_t countReachable() const;

    std::vector<std::unique_ptr<Row[]>> chunks_;  // NOLINT(modernize-avoid-c-arrays)
    NameArena names_;
    RowHashTable byName_;
    RowHashTable byFile_;
    RowHashTable byDocument_;
    std::unordered_map<RowNumber, CarriedAttributes> attributes_;
    std::unordered_set<RowNumber> newAttributes_;
    std::vector<RowNumber> dirty_;
    std::vector<RowNumber> limbo_;  // rows that were put there; some may be placed by now
    RowNumber endOfRows_ = rootRow;
    RowNumber firstFree_ = noRow;  // linked by `next`
    std::size_t count_ = 0;
    std::uint64_t seed_;
};

}  // namespace marrowdale::native
