#pragma once

#include <utility>

#include "platform/services/FileOperations.h"

namespace marrowdale {

// Hands every operation on to another service; derive and override what the test is about.
class ForwardingFileOperations : public FileOperations {
  public:
    explicit ForwardingFileOperations(FileOperations& target) : target_(target) {}

    void importIntoFolder(const URL& source, const URL& folder, URLHandler handler) override {
        target_.importIntoFolder(source, folder, std::move(handler));
    }
    void createSubfolder(const URL& folder, std::string_view name, URLHandler handler) override {
        target_.createSubfolder(folder, name, std::move(handler));
    }
    void renameInPlace(const URL& item, std::string_view newName, URLHandler handler) override {
        target_.renameInPlace(item, newName, std::move(handler));
    }
    void moveIntoFolder(const URL& item, const URL& folder, std::optional<std::string> newName,
                        URLHandler handler) override {
        target_.moveIntoFolder(item, folder, std::move(newName), std::move(handler));
    }
    void trashIntoFolder(const URL& item, const URL& trashFolder, URLHandler handler) override {
        target_.trashIntoFolder(item, trashFolder, std::move(handler));
    }
    void moveIntoFolderAvoidingCollision(const URL& item, const URL& folder,
                                         URLHandler handler) override {
        target_.moveIntoFolderAvoidingCollision(item, folder, std::move(handler));
    }
    void deleteItemAtURL(const URL& item, ErrorHandler handler) override {
        target_.deleteItemAtURL(item, std::move(handler));
    }

  private:
    FileOperations& target_;
};

}  // namespace marrowdale
