#pragma once

#include <cerrno>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <tuple>
#include <vector>

#include "platform/linux/files/DocumentIndex.h"

namespace marrowdale::native {

// A document index for tests of what lies above it: numbers documents from 1 by who their files are
// (device, inode number, birth), remembers what it was told, keeps nothing. Any thread.
class FakeDocumentIndex final : public DocumentIndex {
  public:
    // A copy of one request, as it arrived.
    struct Told {
        FileID folder{};
        std::string folderPath;
        std::string name;
        EntryStatus status;
        DocumentID document{};
    };

    [[nodiscard]] Expected<void> assignDocumentIDs(std::span<Request> requests) override {
        const std::lock_guard lock(mutex_);
        ++assignCalls_;
        if (failure_) {
            return Unexpected(*failure_);
        }
        for (Request& request : requests) {
            const auto next = DocumentID{static_cast<std::uint32_t>(documents_.size() + 1)};
            request.document = documents_.try_emplace(keyOf(request.status), next).first->second;
            request.isThere = request.name != goneName_;
            if (recording_) {
                told_.push_back({request.folder, std::string(request.folderPath),
                                 std::string(request.name), request.status, request.document});
            }
        }
        return {};
    }

    [[nodiscard]] Expected<void> confirmFolders(std::span<Request> requests) override {
        const std::lock_guard lock(mutex_);
        if (failure_) {
            return Unexpected(*failure_);
        }
        for (Request& request : requests) {
            request.isThere = request.name != goneName_;
        }
        return {};
    }

    [[nodiscard]] DocumentID knownDocumentID(const EntryStatus& status) override {
        const std::lock_guard lock(mutex_);
        const auto known = documents_.find(keyOf(status));
        return known == documents_.end() ? DocumentID{} : known->second;
    }

    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file) override {
        const std::lock_guard lock(mutex_);
        const auto known = paths_.find({device, file});
        if (known == paths_.end()) {
            return Unexpected(errorWithPOSIXCode(ENOENT));
        }
        return known->second;
    }

    [[nodiscard]] std::uint32_t subfolderCount(FileID folder) override {
        const std::lock_guard lock(mutex_);
        const auto known = subfolders_.find(folder);
        return known == subfolders_.end() ? 0 : known->second;
    }

    // What the next calls answer.
    void failWith(std::optional<Error> failure) {
        const std::lock_guard lock(mutex_);
        failure_ = std::move(failure);
    }
    // An entry of that name is gone by the time it is asked for.
    void setGone(std::string name) {
        const std::lock_guard lock(mutex_);
        goneName_ = std::move(name);
    }
    void setPath(DeviceID device, FileID file, std::string path) {
        const std::lock_guard lock(mutex_);
        paths_[{device, file}] = std::move(path);
    }
    void setSubfolderCount(FileID folder, std::uint32_t count) {
        const std::lock_guard lock(mutex_);
        subfolders_[folder] = count;
    }

    // What was asked.
    [[nodiscard]] int assignCalls() const {
        const std::lock_guard lock(mutex_);
        return assignCalls_;
    }
    [[nodiscard]] std::vector<Told> told() const {
        const std::lock_guard lock(mutex_);
        return told_;
    }
    // Off for measurements.
    void setRecording(bool recording) {
        const std::lock_guard lock(mutex_);
        recording_ = recording;
    }

  private:
    using Key = std::tuple<DeviceID, FileID, Date>;
    static Key keyOf(const EntryStatus& status) {
        return {status.device, status.fileID, status.birth};
    }

    mutable std::mutex mutex_;  // guards everything below
    std::map<Key, DocumentID> documents_;
    std::map<std::pair<DeviceID, FileID>, std::string> paths_;
    std::map<FileID, std::uint32_t> subfolders_;
    std::optional<Error> failure_;
    std::vector<Told> told_;
    std::string goneName_;
    int assignCalls_ = 0;
    bool recording_ = true;
};

}  // namespace marrowdale::native
