#include "platform/linux/events/WatcherChoice.h"

#include <string>
#include <system_error>
#include <utility>

#include "platform/linux/events/FanotifyWatcher.h"
#include "platform/linux/events/InotifyWatcher.h"

namespace marrowdale::native {

namespace {

using Made = Expected<std::unique_ptr<Watcher>>;

// A watcher of that kind that was tried on the folder.
template <typename Kind>
Made tried(int folder, Expected<std::unique_ptr<Kind>> made) {
    if (!made) {
        return Unexpected(made.error());
    }
    const auto works = (*made)->tryFolder(folder);
    if (!works) {
        return Unexpected(works.error());
    }
    return std::move(*made);
}

Made makeFanotify(int folder, std::string reason, const WatcherCalls& calls) {
    return tried(folder, FanotifyWatcher::create(std::move(reason), FanotifyWatcher::Queue::bounded,
                                                 calls.fanotify));
}

Made makeInotify(int folder, std::string reason, const WatcherCalls& calls) {
    return tried(folder, InotifyWatcher::create(std::move(reason), calls.inotify));
}

// "fanotify_init says: Function not implemented"
std::string saying(const Error& error) {
    return error.operation + " says: " + std::generic_category().message(error.code);
}

}  // namespace

Expected<std::unique_ptr<Watcher>> chooseWatcher(int folder, std::optional<Watcher::Kind> preferred,
                                                 const WatcherCalls& calls) {
    if (preferred == Watcher::Kind::fanotify) {
        return makeFanotify(folder, "fanotify, because it was asked for", calls);
    }
    if (preferred == Watcher::Kind::inotify) {
        return makeInotify(folder, "inotify, because it was asked for", calls);
    }
    auto fanotify = makeFanotify(
        folder, "fanotify, because this user may set its marks on this file system", calls);
    if (fanotify) {
        return fanotify;
    }
    const std::string refusal = saying(fanotify.error());
    auto inotify = makeInotify(folder, "inotify, because " + refusal, calls);
    if (!inotify) {
        return Unexpected(errorWithPOSIXCode(inotify.error().code, "watch folders",
                                             refusal + "; " + saying(inotify.error())));
    }
    return inotify;
}

Expected<std::unique_ptr<Watcher>> makeWatcher(int folder, std::optional<Watcher::Kind> preferred) {
    return chooseWatcher(folder, preferred, {});
}

}  // namespace marrowdale::native
