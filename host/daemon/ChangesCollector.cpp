#include "host/daemon/ChangesCollector.h"

#include <charconv>

namespace marrowdale::host {

namespace {

constexpr std::string_view fileIDPrefix = "fid=";

std::optional<std::uint64_t> fileIDOf(std::string_view identifier) {
    if (!identifier.starts_with(fileIDPrefix)) {
        return std::nullopt;
    }
    identifier.remove_prefix(fileIDPrefix.size());
    std::uint64_t number = 0;
    const char* const end = identifier.data() + identifier.size();
    const auto parsed = std::from_chars(identifier.data(), end, number);
    return parsed.ptr == end && parsed.ec == std::errc() ? std::optional(number) : std::nullopt;
}

}  // namespace

void ChangesCollector::didUpdateItems(std::vector<FileProviderItemPtr> items) {
    for (FileProviderItemPtr& item : items) {
        const std::string identifier = item->itemIdentifier;
        if (item->fileID) {
            identifiersByFileID_[*item->fileID] = identifier;
        }
        tell(identifier, std::move(item));
    }
}

void ChangesCollector::didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) {
    for (std::string& identifier : identifiers) {
        // It also means the item that was told of with that file number.
        const auto number = fileIDOf(identifier);
        const auto known = number ? identifiersByFileID_.find(*number) : identifiersByFileID_.end();
        if (known != identifiersByFileID_.end()) {
            forget(std::string(known->second));
        }
        forget(identifier);
    }
}

void ChangesCollector::forget(const std::string& identifier) {
    tell(identifier, nullptr);
    // An answer is a few hundred words long at most.
    for (std::size_t at = 0; at < words_.size(); ++at) {
        const Word& word = words_[at];
        if (word.item && !word.isStale && word.item->parentItemIdentifier == identifier) {
            forget(std::string(word.identifier));
        }
    }
}

void ChangesCollector::tell(const std::string& identifier, FileProviderItemPtr item) {
    const auto [entry, isNew] = lastWords_.try_emplace(identifier, words_.size());
    if (!isNew) {
        words_[entry->second].isStale = true;
        entry->second = words_.size();
    }
    words_.push_back({identifier, std::move(item)});
}

void ChangesCollector::finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) {
    anchor_ = std::move(anchor);
    moreComing_ = moreComing;
    finished_.signal();
}

void ChangesCollector::finishEnumeratingWithError(const Error& error) {
    error_ = error;
    finished_.signal();
}

ItemChanges ChangesCollector::gathered() const {
    ItemChanges changes{{}, {}, anchor_, moreComing_};
    for (const Word& word : words_) {
        if (word.isStale) {
            continue;
        }
        if (word.item) {
            changes.updated.push_back(word.item);
        } else {
            changes.deleted.push_back(word.identifier);
        }
    }
    return changes;
}

Expected<ItemChanges> ChangesCollector::wait() {
    finished_.wait();
    if (error_) {
        return Unexpected(*error_);
    }
    return gathered();
}

}  // namespace marrowdale::host
