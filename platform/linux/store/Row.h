#pragma once

#include <cstdint>
#include <type_traits>

#include "platform/foundation/Date.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// The number of a row of the index; 0 is none, 1 the root.
using RowNumber = std::uint32_t;
inline constexpr RowNumber noRow = 0;
inline constexpr RowNumber rootRow = 1;

enum class RowKind : std::uint8_t { free, file, folder, other };

// One name in the tree, in memory and in the snapshot (docs/formats/store.md). 64 bytes, so that a
// row never lies in two cache lines.
struct alignas(64) Row {
    static constexpr std::uint32_t kindBits = 3U;
    static constexpr std::uint32_t unsure = 1U << 2U;
    static constexpr std::uint32_t severalLinks = 1U << 3U;
    static constexpr std::uint32_t unreadable = 1U << 4U;
    static constexpr std::uint32_t limbo = 1U << 5U;  // has no place now; perhaps it was moved
    // A library that was not recorded for a while: nobody was told what is in it.
    static constexpr std::uint32_t untold = 1U << 6U;
    // Those that are kept on disk; the rest lives for one reconcile or one commit.
    static constexpr std::uint32_t lastingFlags = 0x00FFFF7FU;
    static constexpr std::uint32_t seen = 1U << 24U;  // met by the reconcile that is running
    // A folder that was not listed since it is known or the index was loaded, so not watched.
    static constexpr std::uint32_t unlisted = 1U << 25U;
    static constexpr std::uint32_t visiting = 1U << 26U;  // being listed
    static constexpr std::uint32_t dirty = 1U << 27U;     // differs from the log
    // What the next events are to tell of the row.
    static constexpr std::uint32_t touchedAppeared = 1U << 29U;
    static constexpr std::uint32_t touchedChanged = 1U << 30U;
    static constexpr std::uint32_t touchedRenamed = 1U << 31U;
    static constexpr std::uint32_t touched = touchedAppeared | touchedChanged | touchedRenamed;
    // Dirty, and more than `Index::update` changes: place, name, file or document.
    static constexpr std::uint32_t renewed = 1U << 28U;
    static constexpr std::uint32_t ageShift = 8;
    static constexpr std::uint32_t ageLimit = 0xFFFF;

    std::uint64_t fileID;
    std::int64_t birth;  // nanoseconds since 1970, modulo 2^64; 0 where none is kept
    std::int64_t changed;
    std::uint64_t size;         // of a file
    std::uint32_t fingerprint;  // of the kernel's file handle; 0 for none
    RowNumber parent;
    std::uint32_t document;  // 0: none yet
    std::uint32_t name;      // offset in the arena
    RowNumber next;          // of the same folder
    RowNumber previous;      // the first one's is the last one
    std::uint32_t flags;
    // Of a folder: digest of its own metadata; 0: not looked at yet. Of a file in limbo: the row of
    // the folder that it left; 0: none. Else 0.
    std::uint32_t attributes;

    [[nodiscard]] RowKind kind() const { return static_cast<RowKind>(flags & kindBits); }
    [[nodiscard]] bool isFree() const { return kind() == RowKind::free; }
    [[nodiscard]] bool isFolder() const { return kind() == RowKind::folder; }
    [[nodiscard]] bool has(std::uint32_t flag) const { return (flags & flag) != 0; }
    void set(std::uint32_t flag, bool on) { flags = on ? flags | flag : flags & ~flag; }
    // Among the names of one file; the lowest is the oldest.
    [[nodiscard]] std::uint32_t age() const { return (flags >> ageShift) & ageLimit; }
    void setAge(std::uint32_t age) {
        flags = (flags & ~(ageLimit << ageShift)) | (age < ageLimit ? age : ageLimit) << ageShift;
    }

    // A folder has no size of its own; its place holds the first child and the number of
    // subfolders.
    [[nodiscard]] RowNumber firstChild() const {
        return isFolder() ? static_cast<RowNumber>(size) : noRow;
    }
    void setFirstChild(RowNumber row) { size = (size & ~std::uint64_t{0xFFFFFFFF}) | row; }
    [[nodiscard]] std::uint32_t subfolders() const {
        return static_cast<std::uint32_t>(size >> 32U);
    }
    void setSubfolders(std::uint32_t count) {
        size = (std::uint64_t{count} << 32U) | static_cast<RowNumber>(size);
    }
};
static_assert(sizeof(Row) == 64 && std::is_trivially_copyable_v<Row>);

// Whether two rows with one file number are names of one file. One whose handle could not be read
// when it was looked at is not told apart.
[[nodiscard]] inline bool areOneFile(const Row& one, const Row& other) {
    const bool bothHandles = one.fingerprint != 0 && other.fingerprint != 0;
    return one.kind() == other.kind() && one.birth == other.birth &&
           (!bothHandles || one.fingerprint == other.fingerprint);
}

// Dates as rows hold them: compared for being the same, never ordered.
[[nodiscard]] inline std::int64_t rowTime(const Date& date) {
    return static_cast<std::int64_t>(static_cast<std::uint64_t>(date.seconds) * 1'000'000'000U +
                                     date.nanoseconds);
}
[[nodiscard]] inline std::int64_t rowBirth(const EntryStatus& status) {
    return status.hasBirth ? rowTime(status.birth) : 0;
}
[[nodiscard]] inline RowKind rowKind(const EntryStatus& status) {
    return status.isDirectory() ? RowKind::folder
           : status.isRegular() ? RowKind::file
                                : RowKind::other;
}

}  // namespace marrowdale::native
