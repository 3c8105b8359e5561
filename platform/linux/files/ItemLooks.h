#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "platform/linux/files/EntryLooks.h"
#include "platform/linux/files/FileSources.h"
#include "platform/services/FileSystem.h"

namespace marrowdale::native {

// Looks at items that somebody names, as a walk looks at those it finds. Items of one folder are
// looked at through that folder, opened once; folders are shared out between two threads. One
// object a call; must not outlive the sources.
class ItemLooks {
  public:
    ItemLooks(const LookRequest& request, const FileSources& sources);

    // What FileSystem::lookAt answers. `urls` outlive the call.
    [[nodiscard]] std::vector<Expected<URL>> lookAt(std::span<const URL> urls);

  private:
    struct Item : LookedEntry {
        const URL* url = nullptr;
        std::size_t answer = 0;  // its place in the answers
    };
    // Items that are looked at in one place.
    struct Group {
        std::span<Item> items;
        Expected<std::optional<ServedTrees::Location>> location = std::nullopt;
        std::optional<Mount> mount = std::nullopt;  // of its root; none outside the trees
        FileID folder{};
        std::optional<URL> folderURL = std::nullopt;  // none where the folder is not known
        std::optional<Error> failure = std::nullopt;  // why the place could not be reached
    };

    void sort(std::span<const URL> urls);
    void locateGroups();
    void lookInGroups();
    void lookIn(Group& group, EntryLooks::Threads threads) const;
    void findFolder(Group& group, int descriptor) const;
    void confirmFolders();
    void assignDocumentIDs();
    [[nodiscard]] static Expected<URL> answerFor(Item& item, const Group& group);

    const FileSources& sources_;
    const bool wantsDocumentIDs_;
    const EntryLooks looks_;
    Date start_;
    std::vector<Item> items_;
    std::vector<Group> groups_;
};

}  // namespace marrowdale::native
