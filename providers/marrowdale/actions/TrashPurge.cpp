#include "providers/marrowdale/actions/TrashPurge.h"

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/SerialQueue.h"
#include "providers/marrowdale/actions/TrashActions.h"
#include "providers/marrowdale/actions/TrashAttributes.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemLookup.h"
#include "providers/marrowdale/items/ItemMetadata.h"
#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

namespace {

// So many entries of a trash are held at once.
constexpr std::uint64_t entriesAtOnce = 1000;

// Where hosts hear that a run is over. It goes with the world: whoever leaves a run last need not
// wait until the host has heard.
struct Notifier {
    const SerialQueue queue{"marrowdale.auto-delete.notifier"};
};

// The deletions of one run, and the run itself: who leaves last has the host told.
class Deletions {
  public:
    Deletions(const Platform& platform, std::function<void()> handler)
        : queue_(platform.shared.get<Notifier>("marrowdale.auto-delete-notifier").queue),
          handler_(std::move(handler)) {}

    void enter() { ++pending_; }
    void leave() {
        if (--pending_ == 0) {
            queue_.async(std::move(handler_));
        }
    }

  private:
    const SerialQueue& queue_;
    std::atomic<std::uint64_t> pending_ = 1;  // the run
    std::function<void()> handler_;
};

std::vector<URL> trashFolders(const Platform& platform) {
    std::vector<URL> folders = MRWAppLibraryManager::rootURLsForAppLibraries(platform);
    folders.push_back(platform.manager.documentStorageURL());
    for (URL& folder : folders) {
        folder = folder.appendingPathComponent(trashFolderName);
    }
    return folders;
}

std::string quotedPath(const URL& url) {
    return "\"" + url.path() + "\"";
}

class Purge {
  public:
    Purge(const Platform& platform, const Date& date, std::shared_ptr<Deletions> deletions)
        : platform_(platform), date_(date), deletions_(std::move(deletions)) {}

    // One folder at a time, and of that one stretch after the other: a trash may hold any number.
    void run(const URL& folder) const {
        FSDirectoryEnumerator request;
        request.urls = {folder};
        std::unique_ptr<DirectoryEnumerator> walk;
        do {
            request.limit = entriesAtOnce;
            std::vector<URL> entries;
            auto result = request.enumerate(platform_, entries, std::move(walk));
            if (!result) {
                platform_.log.error("can't enumerate " + folder.path() + "; " +
                                    result.error().description());
                return;
            }
            for (const URL& entry : entries) {
                // What the listing learnt may be old by now, and this can't be undone.
                judge(entry.withoutCachedValues());
            }
            request.offset = result->position;
            request.startPosition = std::move(result->nextPosition);
            walk = std::move(result->restingWalk);
        } while (request.startPosition);
    }

  private:
    void judge(const URL& entry) const {
        const auto trashed = trashDate(entry);
        if (!trashed) {
            writeTrashDate(platform_, entry, Date::now());
            return;
        }
        if (*trashed < date_) {
            remove(entry);
        }
    }

    std::optional<Date> trashDate(const URL& entry) const {
        const auto data = initWithValueOfXattr(platform_, trashDateAttribute, entry);
        if (!data) {
            platform_.log.debug([&] {
                return "can't find trash date for URL " + quotedPath(entry) + "; set current date";
            });
            return std::nullopt;
        }
        const auto date = unarchivedObject<Date>(
            platform_, *data, std::string(trashDateAttribute) + " of " + quotedPath(entry));
        if (!date) {
            platform_.log.debug([&] {
                return "can't unarchive xattr data for URL " + quotedPath(entry) +
                       "; set current date";
            });
            return std::nullopt;
        }
        return *date;
    }

    void remove(const URL& entry) const {
        const auto identifier = fetchIdentifierOfItemAt(platform_, entry);
        if (!identifier) {
            platform_.log.error("identifier lookup failed for URL \"" + entry.absoluteString() +
                                "\"");
            return;
        }
        platform_.log.debug([&] {
            return "item " + *identifier + " was trashed before reference date, let's remove it";
        });
        deletions_->enter();
        deleteItem(platform_, *identifier,
                   [&platform = platform_, deletions = deletions_,
                    identifier = *identifier](const std::optional<Error>& error) {
                       if (error) {
                           platform.log.error("can't remove item " + identifier + "; " +
                                              error->description());
                       }
                       deletions->leave();
                   });
    }

    const Platform& platform_;
    const Date& date_;
    std::shared_ptr<Deletions> deletions_;
};

}  // namespace

void removeTrashedItemsOlderThan(const Platform& platform, const Date& date,
                                 std::function<void()> handler) {
    const LogSection section(platform.log,
                             [&] { return "remove trashed items older than " + date.rfc3339(); });
    const auto deletions = std::make_shared<Deletions>(platform, std::move(handler));
    const Purge purge(platform, date, deletions);
    for (const URL& folder : trashFolders(platform)) {
        purge.run(folder);
    }
    platform.log.debug([] { return "wait until all deletions are complete"; });
    deletions->leave();
}

}  // namespace marrowdale
