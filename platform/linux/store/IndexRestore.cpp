// Making the index from the rows that a snapshot and the log hold.

#include <string>
#include <string_view>

#include "platform/linux/store/Index.h"

namespace marrowdale::native {

Row* Index::addRawRows(RowNumber count) {
    const auto start = static_cast<RowNumber>(chunks_.size() * std::size_t{rowsPerChunk});
    growTo(start + count);
    return at(start);
}

void Index::restoreRow(RowNumber number, const Row& values, std::string_view name) {
    growTo(number + 1);
    Row& entry = row(number);
    if (!entry.isFree() && names_.at(entry.name) == name) {
        const std::uint32_t offset = entry.name;
        entry = values;
        entry.name = offset;
        return;
    }
    names_.remove(entry.name);
    entry = values;
    entry.name = name.empty() ? NameArena::noName : names_.add(name);
}

bool Index::restoreTouch(RowNumber number, const Row& values) {
    if (number >= endOfRows_ || row(number).isFree() || row(number).kind() != values.kind()) {
        return false;
    }
    Row& entry = row(number);
    entry.flags = values.flags;
    entry.changed = values.changed;
    entry.size = values.size;
    entry.fingerprint = values.fingerprint;
    entry.attributes = values.attributes;
    return true;
}

bool Index::restoreAttributes(RowNumber number, CarriedAttributes attributes) {
    if (number < rootRow) {
        return false;
    }
    if (attributes.empty()) {
        attributes_.erase(number);  // of a row too that was made and removed within one commit
        return true;
    }
    if (number >= endOfRows_) {
        return false;
    }
    attributes_.insert_or_assign(number, std::move(attributes));
    return true;
}

void Index::freeRestoredRow(RowNumber number) {
    attributes_.erase(number);
    names_.remove(row(number).name);
    row(number) = Row{};
}

// A name with a "/" in it is a library's.
bool Index::hasGoodName(RowNumber number) const {
    const Row& entry = row(number);
    if (!names_.isGood(entry.name)) {
        return false;
    }
    const std::string_view text = name(number);
    const std::size_t slash = text.rfind('/');
    return slash == std::string_view::npos || (slash == 0 && text.size() > 1 && entry.isFolder() &&
                                               (entry.parent == rootRow || entry.has(Row::limbo)));
}

bool Index::isGoodRow(RowNumber number) const {
    const Row& entry = row(number);
    if (number == rootRow) {
        return entry.isFolder() && entry.parent == noRow && entry.name == NameArena::noName;
    }
    if (entry.has(Row::limbo)) {
        return hasGoodName(number) && entry.parent == noRow;
    }
    return hasGoodName(number) && entry.parent != noRow && entry.parent < endOfRows_ &&
           row(entry.parent).isFolder();
}

bool Index::finishRestoring() {
    count_ = 0;
    firstFree_ = noRow;
    limbo_.clear();
    if (endOfRows_ <= rootRow) {
        return true;  // nothing known yet
    }
    return linkRestored() && countReachable() == count_ && indexRestored();
}

bool Index::linkRestored() {
    for (RowNumber number = rootRow; number < endOfRows_; ++number) {
        Row& entry = row(number);
        entry.flags &= Row::lastingFlags;
        if (entry.isFolder()) {
            entry.size = 0;
            entry.set(Row::unlisted, true);
        }
    }
    for (RowNumber number = endOfRows_ - 1; number >= rootRow; --number) {
        if (row(number).isFree()) {
            row(number) = Row{};
            row(number).next = firstFree_;
            firstFree_ = number;
        }
    }
    for (RowNumber number = rootRow; number < endOfRows_; ++number) {
        if (row(number).isFree()) {
            continue;
        }
        if (!isGoodRow(number)) {
            return false;
        }
        ++count_;
        if (row(number).has(Row::limbo)) {
            limbo_.push_back(number);
        } else if (number != rootRow) {
            link(number);
        }
    }
    return !row(rootRow).isFree();
}

std::size_t Index::countReachable() const {
    std::size_t reached = 0;
    std::vector<RowNumber> left = limbo_;
    left.push_back(rootRow);
    while (!left.empty()) {
        const RowNumber number = left.back();
        left.pop_back();
        ++reached;
        if (!row(number).isFolder()) {
            continue;
        }
        for (RowNumber below = row(number).firstChild(); below != noRow; below = row(below).next) {
            if (row(below).isFolder()) {
                left.push_back(below);
            } else {
                ++reached;
            }
        }
    }
    return reached;
}

bool Index::indexRestored() {
    std::size_t documents = 0;
    for (RowNumber number = rootRow; number < endOfRows_; ++number) {
        documents += row(number).document != 0 ? 1U : 0U;
    }
    byName_.reserve(count_);
    byFile_.reserve(count_);
    byDocument_.reserve(documents);
    for (RowNumber number = rootRow; number < endOfRows_; ++number) {
        const Row& entry = row(number);
        if (entry.isFree()) {
            continue;
        }
        insertFile(number);
        if (entry.document != 0) {
            insertDocument(number);
        }
        if (number != rootRow && !entry.has(Row::limbo)) {
            if (child(entry.parent, name(number)) != noRow) {
                return false;
            }
            insertName(number);
        }
    }
    return true;
}

}  // namespace marrowdale::native
