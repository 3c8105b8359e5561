#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"
#include "platform/services/FileSystem.h"

namespace marrowdale {

enum class AllocateIfNone : std::uint8_t { no, yes };

// Gives documents their lasting numbers and finds them again. Any thread. Errors: POSIX.
class GenerationStore {
  public:
    virtual ~GenerationStore() = default;

    // The file that holds the document now. ENOENT when no such document exists on the volume;
    // EAGAIN, EBUSY and ESTALE are worth another try.
    [[nodiscard]] virtual Expected<FileID> resolveDocumentID(DocumentID document,
                                                             DeviceID device) = 0;

    // The number of the document in that file; a new one, durable when the call returns, where it
    // has none.
    [[nodiscard]] virtual Expected<DocumentID> getOrAllocateDocumentID(const OpenFile& file) = 0;

    // The same for what stands at the URL (a link itself, not where it leads); with `no`, ENOENT
    // where the file has no document yet. The look-up makes the store take note of which file
    // stands there now, whatever it answers.
    [[nodiscard]] virtual Expected<DocumentID> permanentStorageForItemAtURL(
        const URL& url, AllocateIfNone allocateIfNone) = 0;

    // Gives a document to each entry at the paths that has none, all of them durable with one sync:
    // for whoever is about to ask for each of them. Folders, and what can't be looked at, are left
    // out without an error.
    [[nodiscard]] virtual Expected<void> allocatePermanentStorage(
        std::span<const std::string> paths) = 0;
};

}  // namespace marrowdale
