#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/linux/store/Row.h"

namespace marrowdale::native {

// An open-addressing table of row numbers. A slot is four bytes: 27 bits of row and 5 of the hash,
// so that few rows are fetched that are not meant. The capacity is any number (a hash is mapped to
// it by a multiplication) and grows by a quarter, so that no table is ever half empty. Several rows
// may have one hash.
//
// The table does not know what it is a table of: `hashOf(row)` gives the hash of a row that is in
// it, and must not change while it is.
class RowHashTable {
  public:
    static constexpr RowNumber largestRow = (1U << 27U) - 1;

    // Calls `visit(row)` for each row that may have this hash, until it answers true.
    template <typename Visit>
    void find(std::uint64_t hash, Visit&& visit) const {
        if (slots_.empty()) {
            return;
        }
        const std::uint32_t tag = tagOf(hash);
        for (std::size_t at = homeOf(hash); slots_[at] != 0; at = after(at)) {
            if ((slots_[at] & ~largestRow) == tag && visit(slots_[at] & largestRow)) {
                return;
            }
        }
    }

    template <typename HashOf>
    void insert(std::uint64_t hash, RowNumber row, HashOf&& hashOf) {
        if (static_cast<double>(count_ + 1) > static_cast<double>(slots_.size()) * fullest) {
            grow(slots_.size() + slots_.size() / 4 + 16, hashOf);
        }
        place(hash, row);
        ++count_;
    }

    // Grows at once to hold `count` rows. The table must be empty.
    void reserve(std::size_t count) {
        slots_.assign(static_cast<std::size_t>(static_cast<double>(count) / fullest) + 16, 0);
    }
    // Asks memory for the hash's slot, for a find that comes soon.
    void prefetch(std::uint64_t hash) const { __builtin_prefetch(&slots_[homeOf(hash)]); }

    template <typename HashOf>
    void remove(std::uint64_t hash, RowNumber row, HashOf&& hashOf) {
        if (slots_.empty()) {
            return;
        }
        std::size_t hole = homeOf(hash);
        while (slots_[hole] != 0 && (slots_[hole] & largestRow) != row) {
            hole = after(hole);
        }
        if (slots_[hole] == 0) {
            return;
        }
        // Rows behind the hole move up, unless that would put them before their home.
        for (std::size_t at = after(hole); slots_[at] != 0; at = after(at)) {
            const std::size_t home = homeOf(hashOf(slots_[at] & largestRow));
            const bool homeIsBetween =
                hole <= at ? hole < home && home <= at : hole < home || home <= at;
            if (!homeIsBetween) {
                slots_[hole] = slots_[at];
                hole = at;
            }
        }
        slots_[hole] = 0;
        --count_;
    }

    [[nodiscard]] std::size_t count() const { return count_; }
    [[nodiscard]] std::size_t memory() const { return slots_.capacity() * sizeof(std::uint32_t); }

  private:
    static constexpr double fullest = 0.87;

    [[nodiscard]] static std::uint32_t tagOf(std::uint64_t hash) {
        return static_cast<std::uint32_t>(hash) & ~largestRow;
    }
    [[nodiscard]] std::size_t homeOf(std::uint64_t hash) const {
        return static_cast<std::size_t>(((hash >> 32U) * slots_.size()) >> 32U);
    }
    [[nodiscard]] std::size_t after(std::size_t slot) const {
        return slot + 1 == slots_.size() ? 0 : slot + 1;
    }
    void place(std::uint64_t hash, RowNumber row) {
        std::size_t at = homeOf(hash);
        while (slots_[at] != 0) {
            at = after(at);
        }
        slots_[at] = tagOf(hash) | row;
    }
    template <typename HashOf>
    void grow(std::size_t capacity, HashOf&& hashOf) {
        std::vector<std::uint32_t> old(capacity);
        old.swap(slots_);
        for (const std::uint32_t slot : old) {
            if (slot != 0) {
                place(hashOf(slot & largestRow), slot & largestRow);
            }
        }
    }

    std::vector<std::uint32_t> slots_;  // 0: empty
    std::size_t count_ = 0;
};

}  // namespace marrowdale::native
