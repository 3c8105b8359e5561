#pragma once

#include "platform/linux/files/ServedTrees.h"
#include "platform/services/ExtendedAttributes.h"

namespace marrowdale::native {

// Opens regular files and folders so that their attributes can be set, and nothing else: links,
// pipes, sockets and devices are ENOTSUP and are not opened. What was opened is what was looked at,
// or ESTALE. Any thread.
class LinuxWriteAccess final : public WriteAccess {
  public:
    // The trees must outlive this object.
    explicit LinuxWriteAccess(const ServedTrees& trees) : trees_(trees) {}

    [[nodiscard]] Expected<std::unique_ptr<OpenFile>> openForWriting(const URL& url) override;

  private:
    const ServedTrees& trees_;
};

}  // namespace marrowdale::native
