#include "platform/foundation/AttributeSet.h"

#include <algorithm>
#include <utility>

namespace marrowdale {

AttributeSet::AttributeSet(Names askedNames, std::vector<Entry> entries)
    : askedNames_(std::move(askedNames)), entries_(std::move(entries)) {}

AttributeSet::~AttributeSet() = default;

bool AttributeSet::covers(std::string_view name) const {
    return std::ranges::find(*askedNames_, name) != askedNames_->end();
}

// A handful of names: a scan beats every index.
Expected<std::optional<Data>> AttributeSet::value(std::string_view name) const {
    const auto entry = std::ranges::find_if(
        entries_, [&](const Entry& candidate) { return (*askedNames_)[candidate.name] == name; });
    if (entry == entries_.end()) {
        return std::optional<Data>();
    }
    if (entry->error != 0) {
        return Unexpected(errorWithPOSIXCode(entry->error, "read attribute", name));
    }
    return std::optional<Data>(entry->value);
}

std::size_t AttributeSet::memoryUse() const {
    constexpr std::size_t allocation = 32;  // a block's head, and what shared_ptr puts beside it
    std::size_t bytes = sizeof(*this) + allocation;
    for (const Entry& entry : entries_) {
        bytes += sizeof(Entry) + 2 * (entry.value.size() + allocation);
    }
    return bytes;
}

std::shared_ptr<const void> AttributeSet::derived() const {
    const std::lock_guard lock(derivedMutex_);
    return derived_;
}

void AttributeSet::setDerived(std::shared_ptr<const void> object) const {
    // Swapped, so that the replaced object is released by the parameter's end, after the lock's.
    const std::lock_guard lock(derivedMutex_);
    derived_.swap(object);
}

}  // namespace marrowdale
