#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/linux/files/PackageTypes.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/linux/operations/ItemNames.h"
#include "platform/linux/operations/NoReplace.h"
#include "platform/linux/operations/OperationRun.h"
#include "platform/linux/operations/Temporaries.h"
#include "platform/linux/operations/WorkPlaces.h"
#include "platform/linux/store/OwnMoves.h"

namespace marrowdale::native {

// How a copied file is made before it has a name in its folder.
enum class ImportMethod : std::uint8_t {
    unnamedFile,   // without any name; where the file system has no such files, as below
    hiddenFolder,  // in a temporary folder
};

// What the work is done with; everything referred to outlives it.
struct FileWorkParts {
    const ServedTrees& trees;
    const PackageTypes& packages;
    Temporaries& temporaries;
    NoReplaceMethod noReplace = NoReplaceMethod::rename;
    ImportMethod importing = ImportMethod::unnamedFile;
    OwnMoves* ownMoves = nullptr;  // who is told of moves and removals; null for nobody
};

// The file work itself, on the caller's thread; what each does is told by FileOperations. Any
// thread, several at once.
class FileWork {
  public:
    explicit FileWork(const FileWorkParts& parts) : parts_(parts) {}

    [[nodiscard]] Expected<URL> import(const URL& source, const URL& folder,
                                       OperationRun& run) const;
    [[nodiscard]] Expected<URL> createSubfolder(const URL& folder, std::string_view name) const;
    [[nodiscard]] Expected<URL> rename(const URL& item, const std::string& newName) const;
    [[nodiscard]] Expected<URL> move(const URL& item, const URL& folder,
                                     const std::optional<std::string>& newName) const;
    [[nodiscard]] Expected<URL> moveAvoidingCollision(const URL& item, const URL& folder) const;
    [[nodiscard]] Expected<void> remove(const URL& item, OperationRun& run) const;

  private:
    [[nodiscard]] Expected<URL> moveTo(const WorkItem& item, const WorkFolder& folder,
                                       const std::string& name, std::string_view operation) const;
    [[nodiscard]] Expected<URL> moveToFreeName(const WorkItem& item,
                                               const WorkFolder& folder) const;
    [[nodiscard]] NumberPlace numberPlace(std::string_view name, const EntryStatus& status) const;
    [[nodiscard]] Expected<URL> importFile(const WorkItem& source, const WorkFolder& folder,
                                           const std::string& name, OperationRun& run) const;
    [[nodiscard]] Expected<URL> importThroughFolder(const WorkItem& source,
                                                    const WorkFolder& folder,
                                                    const std::string& name,
                                                    OperationRun& run) const;
    [[nodiscard]] Expected<void> removeApart(const WorkItem& item, OperationRun& run) const;
    [[nodiscard]] Expected<void> bringBack(const WorkItem& item, int from,
                                           const WorkFolder& folder) const;
    [[nodiscard]] static Expected<void> removeInPlace(const WorkItem& item, OperationRun& run);

    FileWorkParts parts_;
};

}  // namespace marrowdale::native
