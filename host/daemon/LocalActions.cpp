#include "host/daemon/LocalActions.h"

#include <cerrno>
#include <fcntl.h>
#include <future>
#include <map>
#include <unistd.h>
#include <utility>

#include "host/requests/TagNames.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/linux/operations/OperationMonitor.h"

namespace marrowdale::host {

namespace {

using Kind = ItemAction::Kind;
using Item = Expected<FileProviderItemPtr>;

// Hands on to the observer what the file work tells, for as long as the action waits.
class Monitor final : public native::OperationMonitor {
  public:
    Monitor(ActionObserver& observer, std::stop_token stop)
        : observer_(observer), stop_(std::move(stop)) {}
    void progressed(const native::OperationProgress& progress) override {
        observer_.progressed({progress.entries, progress.bytes, progress.totalBytes});
    }
    void warned(const std::string& text) override { observer_.warned(text); }
    bool isCancelled() override { return stop_.stop_requested(); }

  private:
    ActionObserver& observer_;
    std::stop_token stop_;
};

// What an item must allow for an action on it.
std::uint64_t neededOf(const ItemAction& action) {
    switch (action.kind) {
        case Kind::rename:
            return allowsRenaming;
        case Kind::move:
            return action.name ? std::uint64_t{allowsReparenting} | allowsRenaming
                               : allowsReparenting;
        case Kind::trash:
            return allowsTrashing;
        case Kind::untrash:
            return allowsReparenting;
        case Kind::remove:
            return allowsDeleting;
        default:
            return 0;  // metadata is kept with everything that takes attributes
    }
}

// Waits for the one answer.
template <typename Call>
Item waitFor(const Call& call) {
    std::promise<Item> answer;
    call(ItemCompletionHandler([&](Item item) { answer.set_value(std::move(item)); }));
    return answer.get_future().get();
}

}  // namespace

Item LocalActions::perform(const ItemAction& action, ActionObserver& observer,
                           const std::stop_token& stop) {
    if (const auto allowed = checkCapabilities(action); !allowed) {
        return Unexpected(allowed.error());
    }
    const native::ScopedOperationMonitor monitor(std::make_shared<Monitor>(observer, stop));
    return ask(action);
}

// What can't be looked up is left for the extension to refuse. The number of a folder that is gone
// may be a document's by now, and that one is not what was meant.
Expected<void> LocalActions::checkCapabilities(const ItemAction& action) {
    const std::uint64_t needed = neededOf(action);
    const bool namesNumber = action.item.starts_with("fid=");
    const auto item =
        needed != 0 || namesNumber ? extension_.itemForIdentifier(action.item) : Item(nullptr);
    if (namesNumber && item && *item && (*item)->itemIdentifier != action.item) {
        return Unexpected(errorForNonExistentItem(action.item));
    }
    if (item && *item && ((*item)->capabilities & needed) != needed) {
        return Unexpected(errorFileWriteNoPermission());
    }
    const bool putsIntoParent =
        action.kind == Kind::import || action.kind == Kind::create || action.kind == Kind::move;
    const auto parent =
        putsIntoParent ? extension_.itemForIdentifier(*action.parent) : Item(nullptr);
    if (parent && *parent && ((*parent)->capabilities & allowsWriting) == 0) {
        return Unexpected(errorFileWriteNoPermission());
    }
    return {};
}

Item LocalActions::ask(const ItemAction& action) {
    switch (action.kind) {
        case Kind::import:
            return waitFor([&](auto handler) {
                extension_.importDocumentAtURL(URL::fileURL(action.path), *action.parent, handler);
            });
        case Kind::create:
            return waitFor([&](auto handler) {
                extension_.createDirectoryWithName(*action.name, *action.parent, handler);
            });
        case Kind::rename:
            return waitFor([&](auto handler) {
                extension_.renameItemWithIdentifier(action.item, *action.name, handler);
            });
        case Kind::move:
            return waitFor([&](auto handler) {
                extension_.reparentItemWithIdentifier(action.item, *action.parent, action.name,
                                                      handler);
            });
        case Kind::trash:
            return trash(action);
        case Kind::untrash:
            return untrash(action);
        case Kind::remove:
            return remove(action);
        case Kind::tag:
            return setTags(action);
        case Kind::favorite:
            return waitFor([&](auto handler) {
                extension_.setFavoriteRank(action.rank, action.item, handler);
            });
        case Kind::used:
            return waitFor([&](auto handler) {
                extension_.setLastUsedDate(action.date, action.item, handler);
            });
        case Kind::purge:
            purge(*action.date);
            return FileProviderItemPtr();
    }
    return Unexpected(errorInvalidParameter("action", ""));
}

bool LocalActions::isOfTheUsersOwn(const FileProviderItem& item) const {
    return relationship(URL::fileURL(rootPath_), item.fileURL) == URLRelationship::contains;
}

// What is remembered is on disk before the item moves: a kill in between costs nothing. Of an app
// library's items it is only shown, since the provider remembers them itself.
Item LocalActions::trash(const ItemAction& action) {
    const auto item = extension_.itemForIdentifier(action.item);
    const bool isRemembered = item && !(*item)->isTrashed;
    if (isRemembered) {
        const auto done = parents_.remember((*item)->itemIdentifier, (*item)->parentItemIdentifier);
        if (!done && isOfTheUsersOwn(**item)) {
            return Unexpected(done.error());
        }
    }
    auto trashed =
        waitFor([&](auto handler) { extension_.trashItemWithIdentifier(action.item, handler); });
    if (!trashed && isRemembered) {
        parents_.forget((*item)->itemIdentifier);
    }
    return trashed;
}

Item LocalActions::untrash(const ItemAction& action) {
    auto parent = action.parent;
    const auto item = extension_.itemForIdentifier(action.item);
    if (!parent && item && (*item)->isTrashed && isOfTheUsersOwn(**item)) {
        parent = putBackParent((*item)->itemIdentifier)
                     .value_or(std::string(VantrelRootContainerItemIdentifier));
    }
    auto back = waitFor(
        [&](auto handler) { extension_.untrashItemWithIdentifier(action.item, parent, handler); });
    if (back) {
        parents_.forget(action.item);
    }
    return back;
}

std::optional<std::string> LocalActions::putBackParent(std::string_view item) {
    auto parent = parents_.parentOf(item);
    const auto folder = parent ? extension_.itemForIdentifier(*parent) : Item(nullptr);
    const bool isThere = folder && *folder && !(*folder)->isTrashed && (*folder)->isFolder();
    return isThere ? std::move(parent) : std::nullopt;
}

Item LocalActions::remove(const ItemAction& action) {
    std::promise<std::optional<Error>> answer;
    extension_.deleteItemWithIdentifier(
        action.item, [&](const std::optional<Error>& error) { answer.set_value(error); });
    const auto error = answer.get_future().get();
    if (error) {
        return Unexpected(*error);
    }
    parents_.forget(action.item);
    return FileProviderItemPtr();
}

Item LocalActions::setTags(const ItemAction& action) {
    const auto data = tagDataFor(action.tags);
    if (!action.tags.empty() && !data) {
        return Unexpected(errorInvalidParameter("TAG", "not UTF-8"));
    }
    return waitFor([&](auto handler) {
        extension_.setTagData(action.tags.empty() ? std::nullopt : data, action.item, handler);
    });
}

void LocalActions::purge(const Date& date) {
    // Looked up while they are there: the extension complains of what is gone.
    std::map<std::string, std::string> paths;
    for (const std::string& known : parents_.items()) {
        const auto item = extension_.itemForIdentifier(known);
        if (item && (*item)->isTrashed) {
            paths.emplace(known, (*item)->fileURL.path());
        } else {
            parents_.forget(known);
        }
    }
    std::promise<void> done;
    extension_._removeTrashedItemsOlderThanDate(date, [&] { done.set_value(); });
    done.get_future().wait();
    for (const auto& [known, path] : paths) {
        if (::faccessat(AT_FDCWD, path.c_str(), F_OK, AT_SYMLINK_NOFOLLOW) != 0 &&
            errno == ENOENT) {
            parents_.forget(known);
        }
    }
}

}  // namespace marrowdale::host
