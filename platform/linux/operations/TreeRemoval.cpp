#include "platform/linux/operations/TreeRemoval.h"

#include <cerrno>
#include <dirent.h>
#include <fcntl.h>
#include <optional>
#include <unistd.h>
#include <utility>

#include "platform/linux/operations/OpenFolders.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view removing = "remove";
constexpr std::size_t smallBuffer = 8U << 10U;
constexpr std::size_t largeBuffer = 256U << 10U;
// How often a folder into which others put files while it is emptied is emptied again.
constexpr int mostRounds = 64;

enum class Removed : std::uint8_t { yes, isFolder };

class Removal {
  public:
    Removal(const std::string& path, OperationRun& run) : path_(path), run_(run) {}

    Expected<void> remove(int folder, const std::string& name) {
        for (int round = 0; round < mostRounds; ++round) {
            if (::unlinkat(folder, name.c_str(), AT_REMOVEDIR) == 0) {
                run_.didEntry();
                return {};
            }
            if (errno == ENOENT) {
                return {};
            }
            if (errno == ENOTDIR) {
                const auto removed = removeEntry(folder, name.c_str());
                if (!removed || *removed == Removed::yes) {
                    return removed ? Expected<void>() : Unexpected(removed.error());
                }
                continue;  // exchanged for a folder just now
            }
            if (errno != ENOTEMPTY && errno != EEXIST) {
                return failed(errno, {});
            }
            if (auto emptied = empty(folder, name); !emptied) {
                return emptied;
            }
        }
        return failed(ENOTEMPTY, {});
    }

  private:
    Expected<void> empty(int folder, const std::string& name) {
        auto top = openFolderBeneath(folder, name);
        if (!top) {
            return wasGone(top.error()) ? Expected<void>() : failed(top.error().code, {});
        }
        folders_ = OpenFolders(smallBuffer, largeBuffer);
        if (const auto begun = folders_.begin(std::move(*top)); !begun) {
            return failed(begun.error().code, {});
        }
        while (true) {
            if (auto checked = run_.checkpoint(removing, path_); !checked) {
                return checked;
            }
            const auto entry = folders_.reader().next();
            if (!entry && entry.error().code != ENOENT) {
                return failed(entry.error().code, {});
            }
            const bool isDone = !entry || !*entry;
            if (isDone && folders_.isAtTop()) {
                return {};
            }
            if (auto done = isDone ? leave() : take(**entry); !done) {
                return done;
            }
        }
    }

    Expected<void> take(const DirectoryReader::Entry& entry) {
        if (entry.type != DT_DIR) {
            const auto removed = removeEntry(folders_.current(), entry.cName());
            if (!removed || *removed == Removed::yes) {
                return removed ? Expected<void>() : Unexpected(removed.error());
            }
        }
        const std::string name(entry.name);
        const auto entered = folders_.enter(name);
        if (entered || wasGone(entered.error())) {
            return {};
        }
        if (entered.error().code == ELOOP || entered.error().code == ENOTDIR) {
            // Exchanged meanwhile; the round after this one sees it again.
            return {};
        }
        return failed(entered.error().code, name);
    }

    // The folder that was emptied goes; one that got new entries meanwhile is emptied again.
    Expected<void> leave() {
        const auto left = folders_.leave();
        if (!left) {
            return failed(left.error().code, {});
        }
        if (::unlinkat(folders_.current(), left->name.c_str(), AT_REMOVEDIR) == 0) {
            run_.didEntry();
            return {};
        }
        // Not empty: the outermost round comes back to it.
        const int code = errno;
        const bool isFine =
            code == ENOENT || code == ENOTDIR || code == ENOTEMPTY || code == EEXIST;
        return isFine ? Expected<void>() : failed(code, left->name);
    }

    Expected<Removed> removeEntry(int folder, const char* name) {
        if (::unlinkat(folder, name, 0) == 0) {
            run_.didEntry();
            return Removed::yes;
        }
        if (errno == ENOENT) {
            return Removed::yes;
        }
        if (errno == EISDIR) {
            return Removed::isFolder;
        }
        return Unexpected(failed(errno, name).error());
    }

    static bool wasGone(const Error& error) { return error.code == ENOENT; }

    Expected<void> failed(int code, const std::string& name) const {
        std::string subject = path_;
        for (const std::string& part : {folders_.path(), name}) {
            if (!part.empty()) {
                subject += "/" + part;
            }
        }
        return Unexpected(errorWithPOSIXCode(code, removing, subject));
    }

    const std::string& path_;
    OperationRun& run_;
    OpenFolders folders_{smallBuffer, largeBuffer};
};

}  // namespace

Expected<void> removeTree(int folder, const std::string& name, const std::string& path,
                          OperationRun& run) {
    return Removal(path, run).remove(folder, name);
}

}  // namespace marrowdale::native
