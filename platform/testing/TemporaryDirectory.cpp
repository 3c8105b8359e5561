#include "platform/testing/TemporaryDirectory.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <vector>

namespace marrowdale {
namespace {

namespace fs = std::filesystem;

// An ordinary user can't look into a folder that a test closed, so each is opened up before it is
// entered. Paths that grow past PATH_MAX are left to remove_all, which goes by folder handles.
void openUp(const fs::path& folder) {
    std::error_code ignored;
    fs::permissions(folder, fs::perms::owner_all, fs::perm_options::add, ignored);
    std::vector<fs::path> subfolders;
    for (fs::directory_iterator entry(folder, ignored), end; !ignored && entry != end;
         entry.increment(ignored)) {
        std::error_code gone;
        if (entry->symlink_status(gone).type() == fs::file_type::directory) {
            subfolders.push_back(entry->path());
        }
    }
    for (const fs::path& subfolder : subfolders) {
        openUp(subfolder);
    }
}

}  // namespace

TemporaryDirectory::TemporaryDirectory(const std::string& parent) {
    const fs::path base = parent.empty() ? fs::temp_directory_path() : fs::path(parent);
    std::string pattern = (fs::canonical(base) / "marrowdale-test-XXXXXX").string();
    if (::mkdtemp(pattern.data()) == nullptr) {
        throw std::system_error(errno, std::generic_category(), pattern);
    }
    path_ = std::move(pattern);
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
    if (fs::exists(fs::symlink_status(path_, ignored))) {
        openUp(path_);
        fs::remove_all(path_, ignored);
    }
}

std::string TemporaryDirectory::path(std::string_view name) const {
    std::string path = path_;
    path += '/';
    path += name;
    return path;
}

}  // namespace marrowdale
