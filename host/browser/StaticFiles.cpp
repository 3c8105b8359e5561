#include "host/browser/StaticFiles.h"

#include <algorithm>

namespace marrowdale::host {

const StaticFile* staticFileAt(std::string_view path) {
    const auto files = staticFiles();
    const auto found = std::ranges::find(files, path, &StaticFile::path);
    return found == files.end() ? nullptr : &*found;
}

}  // namespace marrowdale::host
