// Opening a store, making it anew where it can't be trusted, and closing it.

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <fcntl.h>
#include <sys/stat.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/Reconciler.h"
#include "platform/linux/store/StoreCore.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

Expected<std::string> Store::Core::canonicalPath(const std::string& path) {
    char* resolved = ::realpath(path.c_str(), nullptr);
    if (resolved == nullptr) {
        return Unexpected(errorWithPOSIXCode(errno, "look at", path));
    }
    std::string text = resolved;
    std::free(resolved);  // NOLINT(cppcoreguidelines-no-malloc)
    return text;
}

Store::Core::Core(const StoreOptions& options, StateFolder state, StoreFolder folder,
                  StoreLock lock, UniqueFD root)
    : state_(std::move(state)),
      folder_(std::move(folder)),
      log_(options.log),
      journalOptions_{options.retention, options.clock},
      lock_(std::move(lock)),
      roots_(options.rootPath, std::move(root)),
      packages_(options.packages != nullptr ? *options.packages : PackageTypes()),
      carrier_(options.carriedAttributePrefix),
      wanted_(wantedLibraries(options.libraries, options.rootPath)),
      changes_(index_, packages_),
      saves_(index_, changes_, own_),
      recording_(options.recording),
      watcherKind_(options.watcher) {}

Expected<std::unique_ptr<Store::Core>> Store::Core::open(const StoreOptions& options) {
    auto root = openFolder(options.rootPath);
    if (!root) {
        return Unexpected(
            errorWithPOSIXCode(root.error().code, "open the root folder", options.rootPath));
    }
    if (auto made = makeFolders(options.stateFolder); !made) {
        return Unexpected(made.error());
    }
    auto state = canonicalPath(options.stateFolder);
    if (!state) {
        return Unexpected(state.error());
    }
    StateFolder stateFolder(std::move(*state));
    auto lock = StoreLock::take(stateFolder.lock(), options.lockWait, options.isServed);
    if (!lock) {
        return Unexpected(lock.error());
    }
    const auto binding = RootBinding::of(root->get(), options.rootPath);
    auto folder = binding ? stateFolder.storeOf(*binding) : Unexpected(binding.error());
    if (!folder) {
        return Unexpected(folder.error());
    }
    std::unique_ptr<Core> core(new Core(options, std::move(stateFolder), std::move(*folder),
                                        std::move(*lock), std::move(*root)));
    if (auto done = core->lookAtFolders(options.cacheFolder); !done) {
        return Unexpected(done.error());
    }
    if (auto done = core->loadOrMake(*binding); !done) {
        return Unexpected(done.error());
    }
    core->startWatching();
    if (auto done = core->reconcileOnce(); !done) {
        return Unexpected(done.error());
    }
    core->startRecorder();
    const MutexLock guard(core->mutex_);
    core->waitUntilIdle();
    core->writeSnapshotIfLong();
    return core;
}

Store::Core::~Core() {
    stopRecorder();
    finishUpdates();
    tell(EventHistory::News::closing);
    const MutexLock lock(mutex_);
    if (!journal_) {
        return;
    }
    if (auto committed = commit(); !committed) {
        log("the last changes could not be committed: " + committed.error().description());
    }
    writeSnapshotIfLong();
    if (auto closed = journal_->close(); !closed) {
        log("the store could not be closed: " + closed.error().description());
    }
}

void Store::Core::log(const std::string& text) const {
    if (log_ != nullptr) {
        log_->error(text);
    }
}

Expected<void> Store::Core::lookAtFolders(const std::string& cacheFolder) {
    const auto root = statEntry(roots_.root().open.get(), "");
    if (!root) {
        return Unexpected(errorWithPOSIXCode(root.error().code, "look at", rootPath()));
    }
    device_ = root->device;
    roots_.noteRoot(*root);
    // Made here, so that it is known from the first walk on; the journal says what is wrong with
    // it.
    cacheFolder_ = cacheFolder;
    if (!cacheFolder.empty() && makeFolders(cacheFolder)) {
        cacheFolder_ = canonicalPath(cacheFolder).value_or(cacheFolder);
    }
    for (const FileID folder : unindexedFolders()) {
        if (folder == root->fileID) {
            return Unexpected(
                errorWithPOSIXCode(EINVAL, "keep state or caches in the root folder", rootPath()));
        }
    }
    return {};
}

Expected<void> Store::Core::loadOrMake(const RootBinding& root) {
    std::string reason;
    if (folder_.hasStore()) {
        const auto loaded = load(root);
        if (!loaded) {
            return Unexpected(loaded.error());
        }
        if (loaded->empty()) {
            return sweep();
        }
        reason = *loaded;
        log("the store is made anew: " + reason);
        if (auto done = folder_.setAside(); !done) {
            return done;
        }
    } else {
        reason = state_.reasonToMake(folder_, root);
    }
    if (auto made = make(root, reason); !made) {
        return made;
    }
    return sweep();
}

Expected<void> Store::Core::sweep() const {
    const auto swept = state_.sweep();
    return swept ? folder_.sweep() : swept;
}

Expected<void> Store::Core::make(const RootBinding& root, const std::string& reason) {
    const MutexLock lock(mutex_);
    index_ = Index();
    isFresh_ = true;
    identity_ = StoreIdentity::fresh(root, folder_.state(), reason);
    if (auto made = folder_.create(identity_); !made) {
        return made;
    }
    return loadJournal();
}

// Answers why the store can't be used; empty when it is loaded.
Expected<std::string> Store::Core::load(const RootBinding& root) {
    const auto reasonOf = [](const Error& error) {
        return isDamage(error) ? Expected<std::string>("the store is damaged: " + error.subject)
                               : Unexpected(error);
    };
    auto identity = StoreIdentity::read(folder_.identity());
    if (!identity) {
        return reasonOf(identity.error());
    }
    if (!identity->root.isSameFolderAs(root)) {
        return "it belongs to another folder, which stood at " + identity->root.path;
    }
    if (identity->stateFolder != folder_.state()) {
        return "it was made at " + identity->stateFolder;
    }
    identity_ = std::move(*identity);
    {
        const MutexLock lock(mutex_);
        if (auto loaded = loadJournal(); !loaded) {
            return reasonOf(loaded.error());
        }
    }
    noteRoot(root);
    return std::string();
}

// The folder was moved, or the kernel tells more of it than it did.
void Store::Core::noteRoot(const RootBinding& root) {
    if (identity_.root == root) {
        return;
    }
    StoreIdentity noted = identity_;
    noted.root = root;
    if (auto written = folder_.rewrite(noted); written) {
        identity_ = std::move(noted);
    } else {
        log("where the root folder stands could not be noted: " + written.error().description());
    }
}

Expected<void> Store::Core::loadJournal() {
    auto journal = Journal::load(folder_, identity_, cacheFolder_, index_, journalOptions_);
    if (!journal) {
        return Unexpected(journal.error());
    }
    journal_ = std::move(*journal);
    changes_.recallDepartures();
    lastDocument_ = journal_->lastDocument();
    return {};
}

}  // namespace marrowdale::native
