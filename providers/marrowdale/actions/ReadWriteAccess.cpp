#include "providers/marrowdale/actions/ReadWriteAccess.h"

#include <cerrno>

namespace marrowdale {

int withReadWriteAccess(const Platform& platform, const URL& url,
                        const std::function<int(const OpenFile&)>& block) {
    const auto file = platform.writeAccess.openForWriting(url);
    if (!file) {
        return file.error().domain == ErrorDomain::posix ? file.error().code : EACCES;
    }
    return block(**file);
}

}  // namespace marrowdale
