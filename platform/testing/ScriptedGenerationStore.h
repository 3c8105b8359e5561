#pragma once

#include <cerrno>
#include <deque>
#include <mutex>
#include <string>
#include <vector>

#include "platform/services/GenerationStore.h"

namespace marrowdale {

// Answers each call with the next answer of its list, and the last one over and over; counts the
// calls. Any thread.
class ScriptedGenerationStore : public GenerationStore {
  public:
    std::deque<Expected<FileID>> resolutions{Unexpected(errorWithPOSIXCode(ENOENT))};
    std::deque<Expected<DocumentID>> allocations{Unexpected(errorWithPOSIXCode(ENOENT))};

    Expected<FileID> resolveDocumentID(DocumentID /*document*/, DeviceID /*device*/) override {
        const std::lock_guard lock(mutex_);
        ++resolveCalls_;
        return next(resolutions);
    }
    Expected<DocumentID> getOrAllocateDocumentID(const OpenFile& /*file*/) override {
        const std::lock_guard lock(mutex_);
        return next(allocations);
    }
    // Answered like an allocation, and remembered.
    Expected<DocumentID> permanentStorageForItemAtURL(const URL& url,
                                                      AllocateIfNone allocateIfNone) override {
        const std::lock_guard lock(mutex_);
        lookUps_.push_back({url.path(), allocateIfNone});
        return next(allocations);
    }
    // Does nothing.
    Expected<void> allocatePermanentStorage(std::span<const std::string> /*paths*/) override {
        return {};
    }
    struct LookUp {
        std::string path;
        AllocateIfNone allocateIfNone;
        friend bool operator==(const LookUp&, const LookUp&) = default;
    };
    [[nodiscard]] std::vector<LookUp> lookUps() const {
        const std::lock_guard lock(mutex_);
        return lookUps_;
    }
    [[nodiscard]] int resolveCalls() const {
        const std::lock_guard lock(mutex_);
        return resolveCalls_;
    }

  private:
    template <typename T>
    static T next(std::deque<T>& answers) {
        T answer = answers.front();
        if (answers.size() > 1) {
            answers.pop_front();
        }
        return answer;
    }
    mutable std::mutex mutex_;
    int resolveCalls_ = 0;         // guarded by mutex_
    std::vector<LookUp> lookUps_;  // guarded by mutex_
};

}  // namespace marrowdale
