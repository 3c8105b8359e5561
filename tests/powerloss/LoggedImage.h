#pragma once

#include <string>
#include <sys/types.h>

#include "tests/powerloss/MemoryFile.h"
#include "tests/powerloss/WriteLog.h"

namespace marrowdale::tests {

// A file that is a disk whose every write and flush is logged: a FUSE file system with the one file
// `image`, mounted on a folder of the caller's and served by a child process, which goes when this
// process does. The caller must be root. Where the system refuses, std::system_error fails the
// test.
class LoggedImage {
  public:
    // `contents` is what the file holds at first.
    LoggedImage(std::string folder, const MemoryFile& contents);
    // Unmounts; nobody may have the file open any more. What the log holds stays good.
    ~LoggedImage();
    LoggedImage(const LoggedImage&) = delete;
    LoggedImage& operator=(const LoggedImage&) = delete;

    [[nodiscard]] std::string path() const { return folder_ + "/image"; }
    [[nodiscard]] const WriteLog& log() const { return log_; }

  private:
    std::string folder_;
    MemoryFile contents_;
    WriteLog log_;
    pid_t server_ = -1;
};

}  // namespace marrowdale::tests
