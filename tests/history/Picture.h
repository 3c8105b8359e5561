#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "providers/marrowdale/fs/FSEventReaderDelegate.h"
#include "tests/support/TestWorld.h"

namespace marrowdale::tests {

// What a client knows of a tree who enumerated it once and goes by events alone since then: the
// items by their identifiers. It does what clients are told to do: a deleted "fid=N" is also the
// document that it knows under the file number N; with a folder goes what is in it; a folder that
// was renamed is scanned again.
//
// The world is set before each reader is started, and must live until the reader was stopped. Any
// thread.
class Picture : public FSEventReaderDelegate {
  public:
    // One name of an item; a document that has several is known under each.
    struct Item {
        std::string path;
        std::uint64_t fileID = 0;
        std::uint64_t folder = 0;  // the file number of the one that it is in
        bool isFolder = false;
        // Of a file's contents, as they were when it was told of: size and date of change.
        std::uint64_t size = 0;
        std::int64_t modified = 0;
    };

    void setWorld(TestWorld* world);
    // Takes everything that stands there now, in place of what is known.
    void fill();

    [[nodiscard]] bool knowsPath(const std::string& path) const;
    [[nodiscard]] std::size_t historiesDone() const;
    [[nodiscard]] std::size_t resets() const;
    // Differences between the picture and the visible items on disk now; empty when there are none.
    [[nodiscard]] std::vector<std::string> differences() const;
    // Called within each delegate call that tells of an item.
    void setWithin(std::function<void()> within);

    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                    const FileEvent& event) override;
    void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                    const FileEvent& event) override;
    void fsEventReaderDidFinishHistory(EventID eventID) override;
    void fsEventReaderMustReset() override;

  private:
    using Found = std::vector<std::pair<std::string, Item>>;
    [[nodiscard]] static Item itemOf(const LocalItem& item);
    // Visible items below the folder, by an enumeration.
    [[nodiscard]] Found walk(const std::string& folder) const;
    void remember(const std::string& identifier, Item item);
    void forget(const std::string& identifier);
    // A document that stood at the item's place, whose file's number the item was given, and that
    // went out of sight: to nobody's knowledge but the store's.
    void forgetHidden(const std::string& identifier, const Item& item);
    // All that is in the folder of that file number, and below. Not by its path: another folder may
    // be known there by now.
    void forgetBelow(std::uint64_t folder);
    void note(const std::string& line, const std::string& identifier);

    mutable std::recursive_mutex mutex_;  // guards everything below
    TestWorld* world_ = nullptr;
    std::map<std::string, std::vector<Item>> items_;
    std::map<std::string, std::vector<std::string>> told_;  // the last calls, by identifier
    std::function<void()> within_;
    std::size_t histories_ = 0;
    std::size_t resets_ = 0;
};

}  // namespace marrowdale::tests
