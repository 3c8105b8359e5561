#pragma once

#include <cerrno>

#include "platform/services/FileOperations.h"

namespace marrowdale {

// Operations without a disk: refuses everything (ENOTSUP), at once. Below
// FaultInjectingFileOperations, it answers what the hook leaves out.
class RefusingFileOperations : public FileOperations {
  public:
    void importIntoFolder(const URL& source, const URL& /*folder*/, URLHandler handler) override {
        handler(refusal(source));
    }
    void createSubfolder(const URL& folder, std::string_view /*name*/,
                         URLHandler handler) override {
        handler(refusal(folder));
    }
    void renameInPlace(const URL& item, std::string_view /*newName*/, URLHandler handler) override {
        handler(refusal(item));
    }
    void moveIntoFolder(const URL& item, const URL& /*folder*/,
                        std::optional<std::string> /*newName*/, URLHandler handler) override {
        handler(refusal(item));
    }
    void trashIntoFolder(const URL& item, const URL& /*trashFolder*/, URLHandler handler) override {
        handler(refusal(item));
    }
    void moveIntoFolderAvoidingCollision(const URL& item, const URL& /*folder*/,
                                         URLHandler handler) override {
        handler(refusal(item));
    }
    void deleteItemAtURL(const URL& item, ErrorHandler handler) override {
        handler(refusal(item).error());
    }

  private:
    static Unexpected refusal(const URL& url) {
        return Unexpected(errorWithPOSIXCode(ENOTSUP, "work on", url.path()));
    }
};

}  // namespace marrowdale
