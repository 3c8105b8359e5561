#include "platform/linux/operations/TreeCopy.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <optional>
#include <string_view>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/operations/FileCopy.h"
#include "platform/linux/operations/OpenFolders.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view importing = "import";
constexpr std::size_t smallBuffer = 8U << 10U;
constexpr std::size_t largeBuffer = 256U << 10U;
constexpr std::uint32_t permissionBits = 0777;
constexpr std::uint32_t ownerMayWrite = 0200;

Unexpected failed(int code, const std::string& path) {
    return Unexpected(errorWithPOSIXCode(code, importing, path));
}

// What went from under a copy was changed.
Unexpected failedOrChanged(int code, const std::string& path) {
    return failed(code == ENOENT || code == ESTALE ? EBUSY : code, path);
}

Expected<void> copyFile(const CopySource& source, int folder, const std::string& name,
                        OperationRun& run) {
    const auto from = openSource(source);
    if (!from) {
        return failedOrChanged(from.error().code, source.path);
    }
    const UniqueFD to(
        ::openat(folder, name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!to) {
        return failed(errno, source.path);
    }
    auto copied = copyContents(from->get(), to.get(), source.status, source.path, run);
    if (copied) {
        copyAttributes(from->get(), to.get(), source.status, source.path, run);
    }
    return copied;
}

Expected<void> copyLink(const CopySource& source, int folder, const std::string& name) {
    std::string target(source.status.size + 1, '\0');
    const ssize_t length =
        ::readlinkat(source.folder, source.name.c_str(), target.data(), target.size());
    if (length < 0) {
        return failedOrChanged(errno, source.path);
    }
    if (static_cast<std::size_t>(length) == target.size()) {
        return failed(EBUSY, source.path);
    }
    target.resize(static_cast<std::size_t>(length));
    if (::symlinkat(target.c_str(), folder, name.c_str()) != 0) {
        return failed(errno, source.path);
    }
    const std::array times{timespec{0, UTIME_OMIT},
                           timespec{source.status.modified.seconds,
                                    static_cast<long>(source.status.modified.nanoseconds)}};
    if (::utimensat(folder, name.c_str(), times.data(), AT_SYMLINK_NOFOLLOW) != 0) {
        return failed(errno, source.path);
    }
    return {};
}

Expected<void> makeSpecial(const CopySource& source, int folder, const std::string& name) {
    const std::uint32_t mode = source.status.mode;
    if (S_ISCHR(mode) || S_ISBLK(mode)) {
        return failed(ENOTSUP, source.path);
    }
    const auto kind = static_cast<mode_t>(mode & (S_IFMT | permissionBits));
    return ::mknodat(folder, name.c_str(), kind, 0) == 0 ? Expected<void>()
                                                         : failed(errno, source.path);
}

Expected<void> copyEntry(const CopySource& source, int folder, const std::string& name,
                         OperationRun& run) {
    auto copied = source.status.isRegular()        ? copyFile(source, folder, name, run)
                  : source.status.isSymbolicLink() ? copyLink(source, folder, name)
                                                   : makeSpecial(source, folder, name);
    if (copied) {
        run.didEntry();
    }
    return copied;
}

class FolderCopy {
  public:
    FolderCopy(const CopySource& source, OperationRun& run) : source_(source), run_(run) {}

    Expected<void> copyTo(int folder, const std::string& name) {
        auto from = openSource(source_);
        if (!from) {
            return failedOrChanged(from.error().code, source_.path);
        }
        if (::mkdirat(folder, name.c_str(), 0700) != 0) {
            return failed(errno, source_.path);
        }
        auto to = openFolderBeneath(folder, name);
        auto begun = to ? to_.begin(std::move(*to)) : Unexpected(to.error());
        if (begun) {
            begun = from_.begin(std::move(*from));
        }
        while (begun) {
            const auto entry = next();
            if (!entry) {
                return Unexpected(entry.error());
            }
            if (!*entry && from_.isAtTop()) {
                return finish(from_.current(), from_.status(), to_.current(), source_.path,
                              from_.status().mode | ownerMayWrite);
            }
            begun = *entry ? take(std::move(**entry)) : leave();
        }
        return begun;
    }

  private:
    Expected<std::optional<std::string>> next() {
        if (auto checked = run_.checkpoint(importing, source_.path); !checked) {
            return Unexpected(checked.error());
        }
        const auto entry = from_.reader().next();
        if (!entry) {
            return failedOrChanged(entry.error().code, path({}));
        }
        if (!*entry) {
            return std::optional<std::string>();
        }
        from_.note((*entry)->position);
        return std::optional(std::string((*entry)->name));
    }

    Expected<void> take(std::string name) {
        const auto status = statEntry(from_.current(), name.c_str());
        if (!status) {
            return failedOrChanged(status.error().code, path(name));
        }
        if (!status->isDirectory()) {
            const CopySource entry{from_.current(), name, *status, path(name)};
            return copyEntry(entry, to_.current(), name, run_);
        }
        if (::mkdirat(to_.current(), name.c_str(), 0700) != 0) {
            return failed(errno, path(name));
        }
        auto entered = from_.enter(name);
        if (!entered) {
            return failedOrChanged(entered.error().code, path(name));
        }
        entered = to_.enter(name);
        return entered ? entered : failed(entered.error().code, path({}));
    }

    Expected<void> leave() {
        const std::string path = this->path({});
        const auto from = from_.leave();
        const auto to = to_.leave();
        if (!from || !to) {
            return failedOrChanged((from ? to.error() : from.error()).code, path);
        }
        return finish(from->reader.descriptor(), from->status, to->reader.descriptor(), path,
                      from->status.mode);
    }

    Expected<void> finish(int from, const EntryStatus& before, int to, const std::string& path,
                          std::uint32_t mode) {
        if (auto unchanged = checkUnchanged(from, before, path); !unchanged) {
            return unchanged;
        }
        EntryStatus status = before;
        status.mode = mode;
        copyAttributes(from, to, status, path, run_);
        run_.didEntry();
        return {};
    }

    std::string path(std::string_view name) const {
        const std::string inner = from_.path();
        std::string path = source_.path;
        for (const std::string_view part : {std::string_view(inner), name}) {
            if (!part.empty()) {
                path.append("/").append(part);
            }
        }
        return path;
    }

    const CopySource& source_;
    OperationRun& run_;
    OpenFolders from_{smallBuffer, largeBuffer};
    OpenFolders to_{smallBuffer, smallBuffer};
};

}  // namespace

Expected<UniqueFD> openSource(const CopySource& source) {
    const int kind = source.status.isDirectory() ? O_DIRECTORY : 0;
    UniqueFD opened(::openat(source.folder, source.name.c_str(),
                             O_RDONLY | O_NONBLOCK | O_NOFOLLOW | O_NOCTTY | O_CLOEXEC | kind));
    if (!opened) {
        return failed(errno, source.path);
    }
    const auto status = statEntry(opened.get(), "");
    if (!status || status->fileID != source.status.fileID ||
        status->device != source.status.device || status->mode != source.status.mode) {
        return failed(ESTALE, source.path);
    }
    return opened;
}

Expected<CopiedTree> copyTree(const CopySource& source, int folder, const std::string& name,
                              OperationRun& run) {
    const bool isFolder = source.status.isDirectory();
    const auto copied = isFolder ? FolderCopy(source, run).copyTo(folder, name)
                                 : copyEntry(source, folder, name, run);
    if (!copied) {
        return Unexpected(copied.error());
    }
    return CopiedTree{source.status.mode & permissionBits, isFolder};
}

}  // namespace marrowdale::native
