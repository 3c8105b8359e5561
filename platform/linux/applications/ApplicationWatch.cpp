#include "platform/linux/applications/ApplicationWatch.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include "platform/linux/applications/DesktopEntryFolders.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view documentsName = "Documents";
constexpr std::size_t bufferBytes = std::size_t{16} << 10U;
// Watches are the user's, and others need some.
constexpr std::size_t mostWatches = 4096;
constexpr std::uint32_t mask = IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO |
                               IN_CLOSE_WRITE | IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF |
                               IN_ONLYDIR;

std::string joined(const std::string& folder, std::string_view name) {
    return (folder == "/" ? folder : folder + "/") + std::string(name);
}

bool isFolder(const std::string& path) {
    const auto status = statTarget(AT_FDCWD, path.c_str());
    return status && status->isDirectory();
}

// Another file system stands at the path. Of one there may be nobody to answer.
bool isMount(const std::string& path) {
    const auto status = statEntry(AT_FDCWD, path.c_str());
    return status && status->isMountPoint;
}

std::vector<std::string> foldersIn(const std::string& path) {
    std::vector<std::string> names;
    UniqueFD folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder) {
        return names;
    }
    DirectoryReader reader(std::move(folder), bufferBytes);
    while (names.size() < mostWatches) {
        const auto entry = reader.next();
        if (!entry || !*entry) {
            break;
        }
        if ((*entry)->type == DT_DIR || (*entry)->type == DT_UNKNOWN) {
            names.emplace_back((*entry)->name);
        }
    }
    return names;
}

}  // namespace

Expected<std::unique_ptr<ApplicationWatch>> ApplicationWatch::start(ApplicationPlaces places,
                                                                    std::function<void()> changed) {
    UniqueFD inotify(::inotify_init1(IN_NONBLOCK | IN_CLOEXEC));
    if (!inotify) {
        return Unexpected(errorWithPOSIXCode(errno, "watch", "the applications"));
    }
    UniqueFD end(::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC));
    if (!end) {
        return Unexpected(errorWithPOSIXCode(errno, "watch", "the applications"));
    }
    std::unique_ptr<ApplicationWatch> watch(new ApplicationWatch(
        std::move(places), std::move(changed), std::move(inotify), std::move(end)));
    watch->watchEverything();
    watch->thread_ = std::thread([self = watch.get()] { self->serve(); });
    return watch;
}

ApplicationWatch::ApplicationWatch(ApplicationPlaces places, std::function<void()> changed,
                                   UniqueFD inotify, UniqueFD end)
    : places_(std::move(places)),
      changed_(std::move(changed)),
      inotify_(std::move(inotify)),
      end_(std::move(end)) {}

ApplicationWatch::~ApplicationWatch() {
    if (thread_.joinable()) {
        (void)::eventfd_write(end_.get(), 1);
        thread_.join();
    }
}

void ApplicationWatch::serve() {
    while (waitForEvents()) {
        if (readEvents()) {
            // First, so that what happens from now on leads to another call.
            watchEverything();
            changed_();
        }
    }
}

// False when the watch is to end.
bool ApplicationWatch::waitForEvents() const {
    std::array<pollfd, 2> waits{pollfd{inotify_.get(), POLLIN, 0}, pollfd{end_.get(), POLLIN, 0}};
    while (::poll(waits.data(), waits.size(), -1) < 0 && errno == EINTR) {
    }
    return waits[1].revents == 0;
}

// All that are queued; whether any of them concerns us.
bool ApplicationWatch::readEvents() {
    bool concerned = false;
    alignas(inotify_event) std::array<char, bufferBytes> buffer{};
    for (;;) {
        const ssize_t got = ::read(inotify_.get(), buffer.data(), buffer.size());
        if (got <= 0) {
            return concerned;
        }
        for (std::size_t at = 0; at + sizeof(inotify_event) <= static_cast<std::size_t>(got);) {
            inotify_event event{};
            std::memcpy(&event, buffer.data() + at, sizeof(event));
            const char* const name = buffer.data() + at + sizeof(event);
            concerned =
                concernsUs(event.wd, event.mask, std::string_view(name, event.len)) || concerned;
            if ((event.mask & IN_IGNORED) != 0) {
                watches_.erase(event.wd);
            }
            at += sizeof(event) + event.len;
        }
    }
}

// `name` is padded with zero bytes.
bool ApplicationWatch::concernsUs(int watch, std::uint32_t eventMask, std::string_view name) const {
    if ((eventMask & IN_Q_OVERFLOW) != 0) {
        return true;
    }
    const auto found = watches_.find(watch);
    if (found == watches_.end()) {
        return false;
    }
    const Interest& interest = found->second;
    const bool isFolderItself =
        (eventMask & (IN_DELETE_SELF | IN_MOVE_SELF | IN_IGNORED | IN_UNMOUNT)) != 0;
    const std::string text(name.substr(0, name.find('\0')));
    return isFolderItself || interest.everything || interest.names.contains(text);
}

void ApplicationWatch::watchEverything() {
    std::map<std::string, Interest> wanted;
    for (const ApplicationFolder& folder : places_.folders) {
        wantTree(wanted, folder.path, 0);
    }
    if (!places_.containersFolder.empty()) {
        wantContainers(wanted);
    }
    apply(std::move(wanted));
}

// The name in the folder; where the folder is not there, the first one on the way to it that is
// missing, in the one above.
void ApplicationWatch::want(std::map<std::string, Interest>& wanted, const std::string& folder,
                            const std::string& name) {
    std::string at = folder;
    std::string missing = name;
    while (!isFolder(at) && at.size() > 1) {
        const auto slash = at.rfind('/');
        missing = at.substr(slash + 1);
        at.resize(slash == 0 ? 1 : slash);
    }
    Interest& interest = wanted[at];
    interest.path = at;
    interest.names.insert(missing);
}

void ApplicationWatch::wantTree(std::map<std::string, Interest>& wanted, const std::string& folder,
                                unsigned depth) {
    // That the folder itself comes, or is exchanged.
    const auto slash = folder.rfind('/');
    if (depth == 0) {
        want(wanted, slash == 0 ? "/" : folder.substr(0, slash), folder.substr(slash + 1));
    }
    if (!isFolder(folder) || wanted.size() > mostWatches) {
        return;
    }
    Interest& interest = wanted[folder];
    interest.path = folder;
    interest.everything = true;
    if (depth < DesktopEntryFolders::deepest) {
        for (const std::string& name : foldersIn(folder)) {
            wantTree(wanted, joined(folder, name), depth + 1);
        }
    }
}

void ApplicationWatch::wantContainers(std::map<std::string, Interest>& wanted) {
    const std::string& folder = places_.containersFolder;
    const auto slash = folder.rfind('/');
    want(wanted, folder.substr(0, slash), folder.substr(slash + 1));
    if (!isFolder(folder)) {
        return;
    }
    Interest& interest = wanted[folder];
    interest.path = folder;
    interest.everything = true;
    for (const std::string& name : foldersIn(folder)) {
        if (wanted.size() > mostWatches) {
            return;
        }
        // What lies on another volume is not served.
        if (const std::string application = joined(folder, name); !isMount(application)) {
            want(wanted, application, std::string(documentsName));
        }
    }
}

void ApplicationWatch::apply(std::map<std::string, Interest> wanted) {
    std::map<int, Interest> watches;
    for (auto& [path, interest] : wanted) {
        const int watch = ::inotify_add_watch(inotify_.get(), path.c_str(), mask);
        if (watch < 0) {
            continue;  // it is gone again, or can't be watched
        }
        // One folder may be reached by two paths.
        Interest& known = watches[watch];
        known.path = path;
        known.everything = known.everything || interest.everything;
        known.names.merge(interest.names);
    }
    for (const auto& [watch, interest] : watches_) {
        if (!watches.contains(watch)) {
            (void)::inotify_rm_watch(inotify_.get(), watch);
        }
    }
    watches_ = std::move(watches);
}

}  // namespace marrowdale::native
