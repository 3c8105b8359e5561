#pragma once

#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/services/ApplicationSupport.h"

namespace marrowdale {

// Small files without a disk, whose faults a test decides about. Any thread; the faults are set
// between calls.
class FakeApplicationSupport : public ApplicationSupport {
  public:
    std::vector<URL> directories = {URL::fileURL("/home/u/.local/share")};
    // What these calls answer instead of doing anything.
    std::optional<Error> readFault;
    std::optional<Error> replaceFault;
    std::optional<Error> createDirectoryFault;

    std::vector<URL> applicationSupportDirectories() override { return directories; }
    Expected<void> createDirectory(const URL& url) override {
        if (createDirectoryFault) {
            return Unexpected(*createDirectoryFault);
        }
        const std::lock_guard lock(mutex_);
        created_.push_back(url.path());
        return {};
    }
    Expected<Data> read(const URL& url) override {
        if (readFault) {
            return Unexpected(*readFault);
        }
        const std::lock_guard lock(mutex_);
        const auto file = files_.find(url.path());
        if (file == files_.end()) {
            return Unexpected(Error{ErrorDomain::file, static_cast<int>(FileErrorCode::noSuchFile),
                                    "read", url.path()});
        }
        return file->second;
    }
    Expected<void> replace(const URL& url, const Data& contents) override {
        if (replaceFault) {
            return Unexpected(*replaceFault);
        }
        const std::lock_guard lock(mutex_);
        files_[url.path()] = contents;
        return {};
    }

    [[nodiscard]] std::optional<Data> file(const std::string& path) const {
        const std::lock_guard lock(mutex_);
        const auto file = files_.find(path);
        return file == files_.end() ? std::nullopt : std::optional(file->second);
    }
    [[nodiscard]] std::vector<std::string> created() const {
        const std::lock_guard lock(mutex_);
        return created_;
    }

  private:
    mutable std::mutex mutex_;
    std::map<std::string, Data> files_;  // by path; guarded by mutex_
    std::vector<std::string> created_;   // guarded by mutex_
};

}  // namespace marrowdale
