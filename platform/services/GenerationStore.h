#pragma once

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/services/FileSystem.h"

namespace marrowdale {

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
};

}  // namespace marrowdale
