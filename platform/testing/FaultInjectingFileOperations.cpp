#include "platform/testing/FaultInjectingFileOperations.h"

#include <utility>

namespace marrowdale {

bool FaultInjectingFileOperations::answers(Operation operation, const URL& url,
                                           const URLHandler& handler) {
    auto answered = answer ? answer(operation, url) : std::nullopt;
    if (answered) {
        handler(std::move(*answered));
    }
    return answered.has_value();
}

void FaultInjectingFileOperations::importIntoFolder(const URL& source, const URL& folder,
                                                    URLHandler handler) {
    if (!answers(Operation::importing, source, handler)) {
        ForwardingFileOperations::importIntoFolder(source, folder, std::move(handler));
    }
}

void FaultInjectingFileOperations::createSubfolder(const URL& folder, std::string_view name,
                                                   URLHandler handler) {
    if (!answers(Operation::creating, folder, handler)) {
        ForwardingFileOperations::createSubfolder(folder, name, std::move(handler));
    }
}

void FaultInjectingFileOperations::renameInPlace(const URL& item, std::string_view newName,
                                                 URLHandler handler) {
    if (!answers(Operation::renaming, item, handler)) {
        ForwardingFileOperations::renameInPlace(item, newName, std::move(handler));
    }
}

void FaultInjectingFileOperations::moveIntoFolder(const URL& item, const URL& folder,
                                                  std::optional<std::string> newName,
                                                  URLHandler handler) {
    if (!answers(Operation::moving, item, handler)) {
        ForwardingFileOperations::moveIntoFolder(item, folder, std::move(newName),
                                                 std::move(handler));
    }
}

void FaultInjectingFileOperations::trashIntoFolder(const URL& item, const URL& trashFolder,
                                                   URLHandler handler) {
    if (!answers(Operation::trashing, item, handler)) {
        ForwardingFileOperations::trashIntoFolder(item, trashFolder, std::move(handler));
    }
}

void FaultInjectingFileOperations::moveIntoFolderAvoidingCollision(const URL& item,
                                                                   const URL& folder,
                                                                   URLHandler handler) {
    if (!answers(Operation::movingAvoidingCollision, item, handler)) {
        ForwardingFileOperations::moveIntoFolderAvoidingCollision(item, folder, std::move(handler));
    }
}

void FaultInjectingFileOperations::deleteItemAtURL(const URL& item, ErrorHandler handler) {
    const URLHandler asError = [&](const Expected<URL>& answered) {
        handler(answered ? std::nullopt : std::optional(answered.error()));
    };
    if (!answers(Operation::deleting, item, asError)) {
        ForwardingFileOperations::deleteItemAtURL(item, std::move(handler));
    }
}

}  // namespace marrowdale
