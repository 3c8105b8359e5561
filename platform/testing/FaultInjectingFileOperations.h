#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include "platform/testing/ForwardingFileOperations.h"

namespace marrowdale {

// Answers instead of the real operations where the hook gives an answer, at once and on the
// caller's thread. The hook is set before the calls and not changed during them.
class FaultInjectingFileOperations : public ForwardingFileOperations {
  public:
    enum class Operation : std::uint8_t {
        importing,
        creating,
        renaming,
        moving,
        trashing,
        movingAvoidingCollision,
        deleting,  // a URL as answer counts as success
    };
    using ForwardingFileOperations::ForwardingFileOperations;

    // `url`: the item that is worked on (the source of an import, the folder of a creation).
    std::function<std::optional<Expected<URL>>(Operation, const URL& url)> answer;

    void importIntoFolder(const URL& source, const URL& folder, URLHandler handler) override;
    void createSubfolder(const URL& folder, std::string_view name, URLHandler handler) override;
    void renameInPlace(const URL& item, std::string_view newName, URLHandler handler) override;
    void moveIntoFolder(const URL& item, const URL& folder, std::optional<std::string> newName,
                        URLHandler handler) override;
    void trashIntoFolder(const URL& item, const URL& trashFolder, URLHandler handler) override;
    void moveIntoFolderAvoidingCollision(const URL& item, const URL& folder,
                                         URLHandler handler) override;
    void deleteItemAtURL(const URL& item, ErrorHandler handler) override;

  private:
    // Whether the hook answered.
    [[nodiscard]] bool answers(Operation operation, const URL& url, const URLHandler& handler);
};

}  // namespace marrowdale
