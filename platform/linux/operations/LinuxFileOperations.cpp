#include "platform/linux/operations/LinuxFileOperations.h"

#include <cerrno>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::size_t shortThreads = 2;
constexpr std::size_t longThreads = 4;

}  // namespace

LinuxFileOperations::LinuxFileOperations(const FileWorkParts& parts, Log* log)
    : work_(parts),
      temporaries_(parts.temporaries),
      log_(log),
      short_(shortThreads),
      long_(longThreads) {}

OperationRun LinuxFileOperations::newRun(OperationProgress::Kind kind) {
    return {kind, ScopedOperationMonitor::current(), temporaries_.isStopping(), log_};
}

void LinuxFileOperations::importIntoFolder(const URL& source, const URL& folder,
                                           URLHandler handler) {
    long_.async([this, source, folder, run = newRun(OperationProgress::Kind::importing),
                 handler = std::move(handler)]() mutable {
        const auto checked = run.checkpoint("import", source.path());
        handler(checked ? work_.import(source, folder, run) : Unexpected(checked.error()));
    });
}

void LinuxFileOperations::createSubfolder(const URL& folder, std::string_view name,
                                          URLHandler handler) {
    short_.async([this, folder, name = std::string(name), handler = std::move(handler)] {
        handler(work_.createSubfolder(folder, name));
    });
}

void LinuxFileOperations::renameInPlace(const URL& item, std::string_view newName,
                                        URLHandler handler) {
    short_.async([this, item, newName = std::string(newName), handler = std::move(handler)] {
        handler(work_.rename(item, newName));
    });
}

void LinuxFileOperations::moveIntoFolder(const URL& item, const URL& folder,
                                         std::optional<std::string> newName, URLHandler handler) {
    short_.async([this, item, folder, newName = std::move(newName), handler = std::move(handler)] {
        handler(work_.move(item, folder, newName));
    });
}

void LinuxFileOperations::trashIntoFolder(const URL& item, const URL& trashFolder,
                                          URLHandler handler) {
    moveIntoFolderAvoidingCollision(item, trashFolder, std::move(handler));
}

void LinuxFileOperations::moveIntoFolderAvoidingCollision(const URL& item, const URL& folder,
                                                          URLHandler handler) {
    short_.async([this, item, folder, handler = std::move(handler)] {
        handler(work_.moveAvoidingCollision(item, folder));
    });
}

void LinuxFileOperations::deleteItemAtURL(const URL& item, ErrorHandler handler) {
    long_.async([this, item, run = newRun(OperationProgress::Kind::deleting),
                 handler = std::move(handler)]() mutable {
        const auto removed = work_.remove(item, run);
        handler(removed ? std::nullopt : std::optional(removed.error()));
    });
}

void LinuxFileOperations::finish() {
    temporaries_.stop();
    long_.finish();
    short_.finish();
}

}  // namespace marrowdale::native
