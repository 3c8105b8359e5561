#pragma once

#include <cstddef>
#include <cstdint>
#include <memory_resource>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/linux/files/EntryLooks.h"
#include "platform/linux/files/FileSources.h"
#include "platform/linux/files/FolderStack.h"
#include "platform/services/DirectoryEnumerator.h"

namespace marrowdale::native {

// The walk: entries are read from open folders, looked at relative to them by EntryLooks,
// what a folder holds of a batch together. A batch's document identifiers are asked for in one call
// at its end. Must not outlive what `sources` refers to.
class LinuxDirectoryEnumerator final : public DirectoryEnumerator {
  public:
    // Errors as FileSystem::enumerateDirectory has them.
    [[nodiscard]] static Expected<std::unique_ptr<DirectoryEnumerator>> open(
        const DirectoryEnumerationRequest& request, const FileSources& sources);

    [[nodiscard]] Expected<std::uint64_t> skip(std::uint64_t count) override;
    [[nodiscard]] Expected<std::uint64_t> next(std::uint64_t limit,
                                               std::vector<URL>& urls) override;
    [[nodiscard]] DirectoryPosition position() const override { return stack_.position(); }
    [[nodiscard]] bool takeUp(FolderStack::ErrorHandler errorHandler) override;

  private:
    // An entry of the batch that is being made.
    struct Pending : LookedEntry {
        std::size_t folder = 0;  // in folders_
        std::optional<URL> url;  // once it is made
    };
    struct BatchFolder {
        URL url;
        FileID fileID{};
    };
    using Entry = DirectoryReader::Entry;

    LinuxDirectoryEnumerator(const DirectoryEnumerationRequest& request, const FileSources& sources,
                             FolderStack stack);

    // What is done with each entry of a batch.
    using Step = Expected<void> (LinuxDirectoryEnumerator::*)(const Entry&);
    [[nodiscard]] Expected<std::uint64_t> walk(std::uint64_t count, Step step);
    [[nodiscard]] Expected<std::optional<Entry>> advance();
    [[nodiscard]] Expected<void> leaveFolder(const Expected<std::optional<Entry>>& read);
    [[nodiscard]] bool isHidden(std::string_view name) const;
    [[nodiscard]] bool entersFolder(bool isPackage) const;
    [[nodiscard]] Expected<void> skipEntry(const Entry& entry);
    [[nodiscard]] Expected<void> takeEntry(const Entry& entry);
    [[nodiscard]] Expected<void> reportEntry(const Error& error);
    [[nodiscard]] Expected<void> enter();
    [[nodiscard]] EntryLooks::Folder innermost() const;

    void beginBatch();
    [[nodiscard]] std::size_t batchFolder();
    [[nodiscard]] std::string_view keepName(std::string_view name);
    [[nodiscard]] Expected<void> finishFolder();
    [[nodiscard]] Expected<void> dropUnserved(std::size_t first);
    [[nodiscard]] Expected<void> confirmFolders();
    [[nodiscard]] Expected<void> assignDocumentIDs();
    void makeURLs(std::vector<URL>& urls);
    [[nodiscard]] Unexpected fail(Error error);

    const FileSources& sources_;
    ResourceKeySet keys_;
    DirectoryEnumerationOptions options_;
    FolderStack::ErrorHandler handler_;
    EntryLooks looks_;
    FolderStack stack_;
    std::optional<Error> failure_;  // the walk ended with it

    std::vector<Pending> pending_;
    std::size_t finished_ = 0;  // of pending_, those with attributes and access
    std::vector<BatchFolder> folders_;
    bool folderIsKnown_ = false;  // the last of folders_ is the innermost folder
    std::vector<DocumentIndex::Request> requests_;
    std::vector<LookedEntry*> unfinished_;
    std::pmr::monotonic_buffer_resource names_;
    Date batchStart_;
};

}  // namespace marrowdale::native
