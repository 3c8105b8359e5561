#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// What the file-system service asks of the index that the store keeps. Any thread.
class DocumentIndex {
  public:
    virtual ~DocumentIndex() = default;

    // One entry somebody is about to be told of.
    struct Request {
        FileID folder{};              // the folder it was found in
        std::string_view folderPath;  // absolute; where that folder was opened
        std::string_view name;
        EntryStatus status;
        DocumentID document{};  // the answer
        // Answered too: false where the entry is not there any more. It has a document all the
        // same, for it may stand elsewhere by now; but nobody may ever tell that it is gone from
        // here, if it went before the index knew of it.
        bool isThere = true;
    };

    // Fills in the document identifier of every entry, gives one to those that have none, and
    // returns when they are durable (one sync, and none when nothing was given out). On an error
    // (the store can't be written: ENOSPC, EIO, …) no identifier may be handed out.
    [[nodiscard]] virtual Expected<void> assignDocumentIDs(std::span<Request> requests) = 0;

    // Answers which of these folders are there. Those that are, the index knows: whoever is told of
    // one of them will be told when it goes. What the index never holds is there, as it was seen.
    [[nodiscard]] virtual Expected<void> confirmFolders(std::span<Request> requests) = 0;

    // The document identifier that a file already has; 0 when none.
    [[nodiscard]] virtual DocumentID knownDocumentID(const EntryStatus& status) = 0;

    // Where the file stands now, checked against the disk. ENOENT, ENXIO as FileSystem has it.
    [[nodiscard]] virtual Expected<std::string> pathForFileID(DeviceID device, FileID file) = 0;

    // How many subfolders the folder has, as far as the index knows.
    [[nodiscard]] virtual std::uint32_t subfolderCount(FileID folder) = 0;
};

}  // namespace marrowdale::native
