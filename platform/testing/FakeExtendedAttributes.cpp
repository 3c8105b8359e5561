#include "platform/testing/FakeExtendedAttributes.h"

#include "platform/testing/EmptyFileSystem.h"

namespace marrowdale {

Expected<std::unique_ptr<OpenFile>> FakeWriteAccess::openForWriting(const URL& url) {
    return std::make_unique<FakeOpenFile>(url);
}

}  // namespace marrowdale
