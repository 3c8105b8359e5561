#include "platform/linux/store/Index.h"

#include <algorithm>
#include <cstring>
#include <random>

namespace marrowdale::native {

namespace {

__extension__ using Wide = unsigned __int128;

std::uint64_t mix(std::uint64_t a, std::uint64_t b) {
    const Wide product = Wide{a} * b;
    return static_cast<std::uint64_t>(product) ^ static_cast<std::uint64_t>(product >> 64U);
}

constexpr std::uint64_t factor1 = 0x9E3779B97F4A7C15U;
constexpr std::uint64_t factor2 = 0xD6E8FEB86659FD93U;

std::uint64_t wordAt(const char* bytes, std::size_t count) {
    std::uint64_t word = 0;
    std::memcpy(&word, bytes, count);
    return word;
}

}  // namespace

Index::Index() {
    // A seed of its own for each run, so that nobody can choose names that all collide.
    std::random_device random;
    seed_ = (std::uint64_t{random()} << 32U) | random();
}

std::uint64_t Index::hashOfNumber(std::uint64_t number) const {
    return mix(number ^ seed_, factor1);
}

std::uint64_t Index::hashOfName(RowNumber folder, std::string_view name) const {
    std::uint64_t value = mix(seed_ ^ folder, factor2) ^ name.size();
    const char* bytes = name.data();
    std::size_t left = name.size();
    for (; left >= 8; left -= 8, bytes += 8) {
        std::uint64_t word = 0;
        std::memcpy(&word, bytes, 8);
        value = mix(value ^ word, factor1);
    }
    return mix(value ^ wordAt(bytes, left), factor2);
}

std::size_t Index::memory() const {
    return chunks_.size() * rowsPerChunk * sizeof(Row) + names_.memory() + byName_.memory() +
           byFile_.memory() + byDocument_.memory() +
           (dirty_.capacity() + limbo_.capacity()) * sizeof(RowNumber);
}

RowNumber Index::child(RowNumber folder, std::string_view name) const {
    RowNumber found = noRow;
    byName_.find(hashOfName(folder, name), [&](RowNumber number) {
        const Row& candidate = row(number);
        const bool same = candidate.parent == folder && names_.at(candidate.name) == name;
        found = same ? number : noRow;
        return same;
    });
    return found;
}

std::vector<RowNumber> Index::rowsOfFile(std::uint64_t fileID) const {
    std::vector<RowNumber> rows;
    byFile_.find(hashOfNumber(fileID), [&](RowNumber number) {
        if (row(number).fileID == fileID) {
            rows.push_back(number);
        }
        return false;
    });
    return rows;
}

std::vector<RowNumber> Index::rowsOfDocument(std::uint32_t document) const {
    std::vector<RowNumber> rows;
    byDocument_.find(hashOfNumber(document), [&](RowNumber number) {
        if (row(number).document == document) {
            rows.push_back(number);
        }
        return false;
    });
    return rows;
}

bool Index::path(RowNumber number, std::string& path) const {
    std::size_t length = 0;
    for (RowNumber up = number; up != rootRow; up = row(up).parent) {
        if (up == noRow || row(up).has(Row::limbo)) {
            return false;
        }
        length += name(up).size() + 1;
    }
    path.resize(length == 0 ? 0 : length - 1);
    std::size_t end = path.size();
    for (RowNumber up = number; up != rootRow; up = row(up).parent) {
        const std::string_view part = name(up);
        end -= part.size();
        std::memcpy(path.data() + end, part.data(), part.size());
        if (end > 0) {
            path[--end] = '/';
        }
    }
    return true;
}

bool Index::isWithin(RowNumber number, RowNumber folder) const {
    for (RowNumber up = number; up != noRow; up = row(up).parent) {
        if (up == folder) {
            return true;
        }
    }
    return false;
}

void Index::growTo(RowNumber end) {
    while (chunks_.size() * std::size_t{rowsPerChunk} < end) {
        chunks_.push_back(std::make_unique<Row[]>(rowsPerChunk));  // NOLINT(*-avoid-c-arrays)
    }
    endOfRows_ = std::max(endOfRows_, end);
}

RowNumber Index::takeFree() {
    if (firstFree_ != noRow) {
        const RowNumber number = firstFree_;
        firstFree_ = row(number).next;
        return number;
    }
    if (endOfRows_ > RowHashTable::largestRow) {
        return noRow;
    }
    const RowNumber number = endOfRows_;
    growTo(number + 1);
    return number;
}

RowNumber Index::fill(RowNumber folder, std::string_view name, const Row& values) {
    const std::uint32_t nameOffset = name.empty() ? NameArena::noName : names_.add(name);
    if (nameOffset == NameArena::noName && !name.empty()) {
        return noRow;
    }
    const RowNumber number = takeFree();
    if (number == noRow) {
        names_.remove(nameOffset);
        return noRow;
    }
    Row& fresh = row(number);
    const std::uint32_t wasDirty = fresh.flags & Row::dirty;
    fresh = values;
    fresh.flags = (values.flags & (Row::lastingFlags | Row::seen)) | wasDirty;
    fresh.parent = folder;
    fresh.document = 0;
    fresh.name = nameOffset;
    if (fresh.isFolder()) {
        fresh.size = 0;
        fresh.set(Row::unlisted, true);
    }
    ++count_;
    insertFile(number);
    markRenewed(number);
    return number;
}

RowNumber Index::add(RowNumber folder, std::string_view name, const Row& values) {
    const RowNumber number = fill(folder, name, values);
    if (number != noRow && folder != noRow) {
        link(number);
        insertName(number);
    }
    return number;
}

RowNumber Index::addInLimbo(std::string_view name, const Row& values) {
    const RowNumber number = fill(noRow, name, values);
    if (number != noRow) {
        row(number).set(Row::limbo, true);
        limbo_.push_back(number);
    }
    return number;
}

RowNumber Index::folderLeft(RowNumber number) const {
    const Row& entry = row(number);
    const bool isNoted = entry.has(Row::limbo) && !entry.isFolder() &&
                         entry.attributes >= rootRow && entry.attributes < endOfRows_;
    return isNoted && row(entry.attributes).isFolder() ? entry.attributes : noRow;
}

bool Index::hasLimbo() const {
    return std::ranges::any_of(limbo_, [this](RowNumber number) {
        return !row(number).isFree() && row(number).has(Row::limbo);
    });
}

std::vector<RowNumber> Index::limboRows() const {
    std::vector<RowNumber> rows;
    for (const RowNumber number : limbo_) {
        if (!row(number).isFree() && row(number).has(Row::limbo)) {
            rows.push_back(number);
        }
    }
    std::ranges::sort(rows);
    const auto repeated = std::ranges::unique(rows);
    rows.erase(repeated.begin(), repeated.end());
    return rows;
}

// The list of a folder is kept in the order in which its entries came, which is the order in which
// the disk lists them: the next one is mostly the next row.
void Index::link(RowNumber number) {
    Row& entry = row(number);
    Row& folder = row(entry.parent);
    const RowNumber first = folder.firstChild();
    entry.next = noRow;
    if (first == noRow) {
        entry.previous = number;
        folder.setFirstChild(number);
    } else {
        const RowNumber last = row(first).previous;
        entry.previous = last;
        row(last).next = number;
        row(first).previous = number;
    }
    if (entry.isFolder() && !isLibrary(number)) {
        folder.setSubfolders(folder.subfolders() + 1);
    }
}

void Index::unlink(RowNumber number) {
    Row& entry = row(number);
    Row& folder = row(entry.parent);
    const RowNumber first = folder.firstChild();
    if (first == number) {
        folder.setFirstChild(entry.next);
    } else {
        row(entry.previous).next = entry.next;
    }
    if (entry.next != noRow) {
        row(entry.next).previous = entry.previous;
    } else if (first != number) {
        row(first).previous = entry.previous;
    }
    entry.next = noRow;
    entry.previous = noRow;
    if (entry.isFolder() && !isLibrary(number)) {
        folder.setSubfolders(folder.subfolders() - 1);
    }
}

void Index::insertName(RowNumber number) {
    const auto hashOf = [this](RowNumber other) {
        return hashOfName(row(other).parent, name(other));
    };
    byName_.insert(hashOf(number), number, hashOf);
}

void Index::removeName(RowNumber number) {
    const auto hashOf = [this](RowNumber other) {
        return hashOfName(row(other).parent, name(other));
    };
    byName_.remove(hashOf(number), number, hashOf);
}

void Index::insertFile(RowNumber number) {
    const auto hashOf = [this](RowNumber other) { return hashOfNumber(row(other).fileID); };
    byFile_.insert(hashOf(number), number, hashOf);
}

void Index::removeFile(RowNumber number) {
    const auto hashOf = [this](RowNumber other) { return hashOfNumber(row(other).fileID); };
    byFile_.remove(hashOf(number), number, hashOf);
}

void Index::insertDocument(RowNumber number) {
    const auto hashOf = [this](RowNumber other) { return hashOfNumber(row(other).document); };
    byDocument_.insert(hashOf(number), number, hashOf);
}

void Index::removeDocument(RowNumber number) {
    const auto hashOf = [this](RowNumber other) { return hashOfNumber(row(other).document); };
    byDocument_.remove(hashOf(number), number, hashOf);
}

void Index::putInLimbo(RowNumber number) {
    removeName(number);
    unlink(number);
    Row& entry = row(number);
    entry.set(Row::limbo, true);
    entry.set(Row::seen, false);
    if (!entry.isFolder()) {
        entry.attributes = entry.parent;
    }
    entry.parent = noRow;
    if (limbo_.size() == limbo_.capacity()) {
        std::erase_if(limbo_, [this](RowNumber other) {
            return row(other).isFree() || !row(other).has(Row::limbo);
        });
    }
    limbo_.push_back(number);
    markRenewed(number);
}

bool Index::place(RowNumber number, RowNumber folder, std::string_view name) {
    Row& entry = row(number);
    if (names_.at(entry.name) != name) {
        const std::uint32_t offset = names_.add(name);
        if (offset == NameArena::noName) {
            return false;
        }
        names_.remove(entry.name);
        entry.name = offset;
    }
    entry.parent = folder;
    entry.set(Row::limbo, false);
    if (!entry.isFolder()) {
        entry.attributes = 0;
    }
    link(number);
    insertName(number);
    markRenewed(number);
    return true;
}

void Index::update(RowNumber number, const Row& values) {
    Row& entry = row(number);
    entry.changed = values.changed;
    entry.fingerprint = values.fingerprint;
    if (!entry.isFolder()) {
        entry.size = values.size;
    }
    entry.flags = (entry.flags & ~Row::lastingFlags) | (values.flags & Row::lastingFlags);
    markDirty(number);
}

void Index::setDocument(RowNumber number, std::uint32_t document) {
    Row& entry = row(number);
    if (entry.document != 0) {
        removeDocument(number);
    }
    entry.document = document;
    if (document != 0) {
        insertDocument(number);
    }
    markRenewed(number);
}

const CarriedAttributes& Index::attributes(RowNumber number) const {
    static const CarriedAttributes none;
    const auto found = attributes_.find(number);
    return found == attributes_.end() ? none : found->second;
}

void Index::setAttributes(RowNumber number, const CarriedAttributes& attributes) {
    const auto known = attributes_.find(number);
    if (known == attributes_.end() ? attributes.empty() : known->second == attributes) {
        return;
    }
    if (attributes.empty()) {
        attributes_.erase(known);
    } else {
        attributes_.insert_or_assign(number, attributes);
    }
    newAttributes_.insert(number);
    markDirty(number);
}

void Index::remove(RowNumber number) {
    if (!row(number).has(Row::limbo) && row(number).parent != noRow) {
        putInLimbo(number);
    }
    std::vector<RowNumber> left{number};
    while (!left.empty()) {
        const RowNumber next = left.back();
        left.pop_back();
        if (row(next).isFolder()) {
            for (RowNumber below = row(next).firstChild(); below != noRow;
                 below = row(below).next) {
                removeName(below);
                left.push_back(below);
            }
        }
        freeRow(next);
    }
}

void Index::freeRow(RowNumber number) {
    removeFile(number);
    Row& entry = row(number);
    if (entry.document != 0) {
        removeDocument(number);
    }
    names_.remove(entry.name);
    setAttributes(number, {});
    markDirty(number);
    const std::uint32_t wasDirty = entry.flags & Row::dirty;
    entry = Row{};
    entry.flags = wasDirty;
    entry.next = firstFree_;
    firstFree_ = number;
    --count_;
}

void Index::markDirty(RowNumber number) {
    Row& entry = row(number);
    if (!entry.has(Row::dirty)) {
        entry.set(Row::dirty, true);
        dirty_.push_back(number);
    }
}

void Index::markRenewed(RowNumber number) {
    markDirty(number);
    row(number).set(Row::renewed, true);
}

void Index::clearDirty() {
    for (const RowNumber number : dirty_) {
        row(number).set(Row::dirty | Row::renewed, false);
    }
    std::unordered_set<RowNumber>().swap(newAttributes_);
    std::vector<RowNumber>().swap(dirty_);  // an assignment would keep the memory
}

void Index::compactNames() {
    constexpr std::uint32_t worthwhile = 1U << 20U;
    if (names_.waste() < worthwhile || names_.waste() < names_.size() / 4) {
        return;
    }
    NameArena fresh;
    for (RowNumber number = rootRow; number < endOfRows_; ++number) {
        Row& entry = row(number);
        if (!entry.isFree() && entry.name != NameArena::noName) {
            entry.name = fresh.add(names_.at(entry.name));
        }
    }
    names_ = std::move(fresh);
}

}  // namespace marrowdale::native
