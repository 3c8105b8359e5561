#include "tests/changes/Replica.h"

#include <algorithm>
#include <deque>
#include <utility>

#include <gtest/gtest.h>

#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/CollectingObserver.h"

namespace marrowdale::tests {

namespace {

constexpr std::size_t keptLines = 12;

// What a client is told of an item and can compare. A folder's dates and counts change with what is
// in it, of which the folder's own record is not told.
std::string factsOf(const FileProviderItem& item) {
    std::string text = item.itemIdentifier + " \"" + item.filename + "\" in " +
                       item.parentItemIdentifier + " at " + item.fileURL.path() + ", " +
                       item.typeIdentifier;
    if (item.itemIdentifier.starts_with("did=") && item.documentSize) {
        text += ", " + std::to_string(*item.documentSize) + " bytes";
    }
    return text;
}

// No value when the folder is gone, or the page expired.
std::optional<std::vector<FileProviderItemPtr>> list(FileProviderExtension& provider,
                                                     const std::string& container) {
    const auto enumerator = provider.enumeratorForContainerItemIdentifier(container);
    if (!enumerator) {
        return std::nullopt;
    }
    CollectingObserver observer;
    observer.nextPage = VantrelInitialPageSortedByName();
    while (observer.nextPage) {
        const Data page = *std::exchange(observer.nextPage, std::nullopt);
        (*enumerator)->enumerateItemsForObserver(observer, page);
        if (observer.error) {
            return std::nullopt;
        }
    }
    return observer.pageItems;
}

// Remembers each call in the order in which it came.
class AnswerObserver : public CollectingChangeObserver {
  public:
    Answer answer;

    void didUpdateItems(std::vector<FileProviderItemPtr> items) override {
        answer.update(items);
        CollectingChangeObserver::didUpdateItems(std::move(items));
    }
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override {
        answer.remove(identifiers);
        CollectingChangeObserver::didDeleteItemsWithIdentifiers(std::move(identifiers));
    }
};

}  // namespace

ItemsByIdentifier enumerateAll(FileProviderExtension& provider) {
    ItemsByIdentifier all;
    std::deque<std::string> folders{std::string(VantrelRootContainerItemIdentifier)};
    while (!folders.empty()) {
        const auto items = list(provider, folders.front());
        if (!items) {
            ADD_FAILURE() << "can't list " << folders.front();
        }
        folders.pop_front();
        for (const auto& item : items.value_or(std::vector<FileProviderItemPtr>())) {
            all.emplace(item->itemIdentifier, item);
            if (item->isFolder()) {
                folders.push_back(item->itemIdentifier);
            }
        }
    }
    return all;
}

std::optional<Data> currentAnchor(FileProviderExtension& provider, std::string_view container) {
    std::optional<Data> anchor;
    if (const auto enumerator = provider.enumeratorForContainerItemIdentifier(container)) {
        (*enumerator)->currentSyncAnchorWithCompletionHandler([&](const auto& data) {
            anchor = data;
        });
    }
    return anchor;
}

void Replica::fill(FileProviderExtension& provider) {
    const auto anchor = currentAnchor(provider, workingSet);
    ASSERT_TRUE(anchor);
    anchor_ = *anchor;
    items_.clear();
    told_.clear();
    for (auto& [identifier, item] : enumerateAll(provider)) {
        items_[identifier] = item;
    }
}

bool Replica::catchUp(FileProviderExtension& provider) {
    requests_ = 0;
    for (bool more = true; more;) {
        const auto enumerator = provider.enumeratorForContainerItemIdentifier(workingSet);
        const auto observer = std::make_shared<AnswerObserver>();
        (*enumerator)->enumerateChangesForObserver(observer, anchor_);
        if (!observer->waitForFinish()) {
            ADD_FAILURE() << "no finish";
            return false;
        }
        ++requests_;
        if (observer->error()) {
            EXPECT_EQ(observer->error(), errorSyncAnchorExpired());
            return false;
        }
        apply(observer->answer);
        more = observer->calls().back() == "finish, more";
        if (more && anchor_ == *observer->anchor()) {
            ADD_FAILURE() << "no progress";
            return false;
        }
        anchor_ = *observer->anchor();
    }
    return true;
}

void Replica::apply(const Answer& answer) {
    for (const std::string& identifier : answer.deleted) {
        note(identifier, "deleted");
        remove(identifier);
        std::vector<std::string> same;
        for (const auto& [known, item] : items_) {
            if (item->fileID && "fid=" + std::to_string(*item->fileID) == identifier) {
                same.push_back(known);
            }
        }
        for (const std::string& known : same) {
            note(known, "deleted as " + identifier);
            remove(known);
        }
    }
    for (const auto& [identifier, item] : answer.updated) {
        note(identifier, "updated: " + factsOf(*item));
        items_[identifier] = item;
    }
}

// With a folder goes what is in it: what was moved out of sight with it has no events of its own.
void Replica::remove(const std::string& identifier) {
    if (items_.erase(identifier) == 0 || identifier.starts_with("did=")) {
        return;
    }
    std::vector<std::string> inside;
    for (const auto& [known, item] : items_) {
        if (item->parentItemIdentifier == identifier) {
            inside.push_back(known);
        }
    }
    for (const std::string& known : inside) {
        note(known, "deleted with " + identifier);
        remove(known);
    }
}

void Replica::note(const std::string& identifier, const std::string& line) {
    auto& lines = told_[identifier];
    lines.push_back("request " + std::to_string(requests_) + ": " + line);
    if (lines.size() > keptLines) {
        lines.erase(lines.begin());
    }
}

std::string Replica::toldOf(const std::string& identifier) const {
    std::string text;
    if (const auto lines = told_.find(identifier); lines != told_.end()) {
        for (const std::string& line : lines->second) {
            text += "\n    " + line;
        }
    }
    return text;
}

std::vector<std::string> Replica::differences(FileProviderExtension& provider) const {
    std::vector<std::string> found;
    const auto there = enumerateAll(provider);
    for (auto entry = there.begin(); entry != there.end();
         entry = there.upper_bound(entry->first)) {
        const auto& identifier = entry->first;
        const auto known = items_.find(identifier);
        if (known == items_.end()) {
            found.push_back("missing: " + factsOf(*entry->second) + toldOf(identifier));
            continue;
        }
        // A document with several names is known under one of them.
        const auto [begin, end] = there.equal_range(identifier);
        const std::string facts = factsOf(*known->second);
        if (std::none_of(begin, end,
                         [&](const auto& name) { return factsOf(*name.second) == facts; })) {
            found.push_back("known as " + facts + "\n  is " + factsOf(*entry->second) +
                            toldOf(identifier));
        }
    }
    for (const auto& [identifier, item] : items_) {
        if (!there.contains(identifier)) {
            found.push_back("too much: " + factsOf(*item) + toldOf(identifier));
        }
    }
    return found;
}

}  // namespace marrowdale::tests
