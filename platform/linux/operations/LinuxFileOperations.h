#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Log.h"
#include "platform/linux/operations/FileWork.h"
#include "platform/linux/operations/WorkerPool.h"
#include "platform/services/FileOperations.h"

namespace marrowdale::native {

// Operations on files through Linux's calls. Short ones (making, renaming, moving) and long ones
// (copying, removing) run on threads of their own, so that a long copy keeps nobody waiting. What
// was asked for under a ScopedOperationMonitor is told to that monitor.
class LinuxFileOperations final : public FileOperations {
  public:
    // `log` may be null and outlives the object, as the parts do.
    LinuxFileOperations(const FileWorkParts& parts, Log* log);
    ~LinuxFileOperations() override { finish(); }

    void importIntoFolder(const URL& source, const URL& folder, URLHandler handler) override;
    void createSubfolder(const URL& folder, std::string_view name, URLHandler handler) override;
    void renameInPlace(const URL& item, std::string_view newName, URLHandler handler) override;
    void moveIntoFolder(const URL& item, const URL& folder, std::optional<std::string> newName,
                        URLHandler handler) override;
    void trashIntoFolder(const URL& item, const URL& trashFolder, URLHandler handler) override;
    void moveIntoFolderAvoidingCollision(const URL& item, const URL& folder,
                                         URLHandler handler) override;
    void deleteItemAtURL(const URL& item, ErrorHandler handler) override;

    // Cancels what can be cancelled and returns once every handler was called. Afterwards
    // operations are refused (ECANCELED) on the caller's thread.
    void finish();

  private:
    [[nodiscard]] OperationRun newRun(OperationProgress::Kind kind);

    FileWork work_;
    Temporaries& temporaries_;
    Log* log_;
    WorkerPool short_;
    WorkerPool long_;
};

}  // namespace marrowdale::native
