#include "benchmarks/Trees.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <fcntl.h>
#include <filesystem>
#include <stdexcept>
#include <sys/xattr.h>
#include <system_error>
#include <unistd.h>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/KeyedArchive.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

constexpr std::uint64_t filesOfOneFolder(const Tree& tree) {
    const std::uint64_t files = tree.folders == 0 ? tree.files : tree.files / tree.folders;
    return std::max<std::uint64_t>(files, 1);
}

std::string folderPath(const Tree& tree, std::uint64_t number) {
    if (tree.folders == 0) {
        return tree.path;
    }
    return fmt::format("{}/folder {:05}{}", tree.path, number,
                       tree.hasLongNames ? " with a name of middle length" : "");
}

Data archived(const ArchivedObject& object) {
    auto data = archive(object);
    if (!data) {
        throw std::runtime_error(data.error().description());
    }
    return std::move(*data);
}

// What a file carries that somebody tagged, ranked and opened.
std::vector<std::pair<std::string, Data>> attributes() {
    const ArchivedArray tags{ArchivedObject(std::string("Work")),
                             ArchivedObject(std::string("2024"))};
    return {{"user.com.quillory.lastuseddate#PS", archived(ArchivedObject(Date()))},
            {"user.com.quillory.metadata:_kMDItemUserTags", archived(ArchivedObject(tags))},
            {"user.com.quillory.favorite-rank.number#PS",
             archived(ArchivedObject(Number(std::int64_t{7})))}};
}

[[noreturn]] void fail(const std::string& path) {
    throw std::system_error(errno, std::generic_category(), path);
}

void makeFile(const std::string& path,
              const std::vector<std::pair<std::string, Data>>& attributes) {
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0644);
    if (file < 0) {
        fail(path);
    }
    for (const auto& [name, value] : attributes) {
        if (::fsetxattr(file, name.c_str(), value.bytes().data(), value.size(), 0) != 0) {
            fail(path);
        }
    }
    ::close(file);
}

}  // namespace

void makeTree(const Tree& tree) {
    const std::string done = tree.path + ".complete";
    if (fs::exists(done)) {
        return;
    }
    fs::remove_all(tree.path);
    const auto values = tree.hasAttributes ? attributes() : decltype(attributes()){};
    for (std::uint64_t folder = 0; folder < tree.folders || folder == 0; ++folder) {
        fs::create_directories(folderPath(tree, folder));
    }
    for (std::uint64_t file = 0; file < tree.files; ++file) {
        makeFile(filePath(tree, file), values);
    }
    makeFile(done, {});
}

std::string filePath(const Tree& tree, std::uint64_t number) {
    return fmt::format("{}/document number {:07}{}.txt",
                       folderPath(tree, number / filesOfOneFolder(tree)), number,
                       tree.hasLongNames ? " and little more" : "");
}

}  // namespace marrowdale::benchmarks
