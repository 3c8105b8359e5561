#pragma once

#include <utility>

#include "platform/linux/files/UniqueFD.h"
#include "platform/services/FileSystem.h"

namespace marrowdale::native {

class LinuxOpenFile final : public OpenFile {
  public:
    LinuxOpenFile(UniqueFD descriptor, URL url)
        : descriptor_(std::move(descriptor)), url_(std::move(url)) {}

    [[nodiscard]] int descriptor() const override { return descriptor_.get(); }
    [[nodiscard]] const URL& url() const override { return url_; }

  private:
    UniqueFD descriptor_;
    URL url_;
};

}  // namespace marrowdale::native
