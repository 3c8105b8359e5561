#pragma once

#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>

#include "host/daemon/PutBackParents.h"
#include "host/requests/ItemAction.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// Has actions done by the extension in this process, with what a host adds: it refuses what an
// item's capabilities don't allow before the extension is asked, and remembers where items of the
// user's own documents were trashed from. Any thread, several at once.
class LocalActions {
  public:
    // The extension outlives the object. `rootPath`: the storage root's, canonical.
    LocalActions(FileProviderExtension& extension, std::string rootPath,
                 const std::string& stateFolder)
        : extension_(extension),
          rootPath_(std::move(rootPath)),
          parents_(stateFolder + "/put-back") {}

    // Waits for the end; null for actions that leave no item. A stop cancels what can be cancelled
    // (POSIX ECANCELED, and no trace), and is told to the action's file work alone.
    [[nodiscard]] Expected<FileProviderItemPtr> perform(const ItemAction& action,
                                                        ActionObserver& observer,
                                                        const std::stop_token& stop);
    // The folder that a trashed item goes back to, as far as it is remembered and there.
    [[nodiscard]] std::optional<std::string> putBackParent(std::string_view item);

  private:
    [[nodiscard]] Expected<void> checkCapabilities(const ItemAction& action);
    [[nodiscard]] Expected<FileProviderItemPtr> ask(const ItemAction& action);
    [[nodiscard]] Expected<FileProviderItemPtr> trash(const ItemAction& action);
    [[nodiscard]] Expected<FileProviderItemPtr> untrash(const ItemAction& action);
    [[nodiscard]] Expected<FileProviderItemPtr> remove(const ItemAction& action);
    [[nodiscard]] Expected<FileProviderItemPtr> setTags(const ItemAction& action);
    void purge(const Date& date);
    [[nodiscard]] bool isOfTheUsersOwn(const FileProviderItem& item) const;

    FileProviderExtension& extension_;
    std::string rootPath_;
    PutBackParents parents_;
};

}  // namespace marrowdale::host
