#include "tests/changes/Answer.h"

namespace marrowdale::tests {

void Answer::update(const std::vector<FileProviderItemPtr>& items) {
    for (const auto& item : items) {
        deleted.erase(item->itemIdentifier);
        updated[item->itemIdentifier] = item;
    }
}

void Answer::remove(const std::vector<std::string>& identifiers) {
    for (const std::string& identifier : identifiers) {
        updated.erase(identifier);
        std::erase_if(updated, [&](const auto& entry) {
            const auto fileID = entry.second->fileID;
            return fileID && "fid=" + std::to_string(*fileID) == identifier;
        });
        deleted.insert(identifier);
    }
}

}  // namespace marrowdale::tests
