#pragma once

#include "platform/services/GenerationStore.h"

namespace marrowdale {

// Hands every call on to another store; derive and override what the test is about.
class ForwardingGenerationStore : public GenerationStore {
  public:
    explicit ForwardingGenerationStore(GenerationStore& target) : target_(target) {}

    Expected<FileID> resolveDocumentID(DocumentID document, DeviceID device) override {
        return target_.resolveDocumentID(document, device);
    }
    Expected<DocumentID> getOrAllocateDocumentID(const OpenFile& file) override {
        return target_.getOrAllocateDocumentID(file);
    }
    Expected<DocumentID> permanentStorageForItemAtURL(const URL& url,
                                                      AllocateIfNone allocateIfNone) override {
        return target_.permanentStorageForItemAtURL(url, allocateIfNone);
    }
    Expected<void> allocatePermanentStorage(std::span<const std::string> paths) override {
        return target_.allocatePermanentStorage(paths);
    }

  private:
    GenerationStore& target_;
};

}  // namespace marrowdale
