#include "tests/powerloss/TreeWriter.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <system_error>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/UniqueFD.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::tests {

namespace {

constexpr const char* savedPrefix = "save-";
constexpr std::size_t savedNames = 3;

void check(bool done, const std::string& path) {
    if (!done) {
        throw std::system_error(errno, std::generic_category(), path);
    }
}

native::UniqueFD opened(const std::string& path, int flags) {
    native::UniqueFD file(::open(path.c_str(), flags | O_CLOEXEC, 0600));
    check(static_cast<bool>(file), path);
    return file;
}

}  // namespace

TreeWriter::TreeWriter(std::string root, std::uint32_t seed,
                       std::function<void(const FileKey&)> leaving)
    : root_(std::move(root)), random_(seed), leaving_(std::move(leaving)) {}

bool TreeWriter::isSaved(std::string_view path) {
    return path.substr(path.rfind('/') + 1).starts_with(savedPrefix);
}

void TreeWriter::step() {
    using Deed = void (TreeWriter::*)();
    struct Choice {
        std::uint32_t weight;
        Deed deed;
    };
    static constexpr std::array<Choice, 11> choices{{{30, &TreeWriter::make},
                                                     {12, &TreeWriter::append},
                                                     {10, &TreeWriter::overwrite},
                                                     {5, &TreeWriter::changeMode},
                                                     {18, &TreeWriter::moveFile},
                                                     {10, &TreeWriter::deleteFile},
                                                     {6, &TreeWriter::makeSubfolder},
                                                     {4, &TreeWriter::moveFolder},
                                                     {2, &TreeWriter::deleteFolder},
                                                     {8, &TreeWriter::save},
                                                     {6, &TreeWriter::syncFile}}};
    std::uint32_t all = 2;  // the rest: sync everything
    for (const Choice& choice : choices) {
        all += choice.weight;
    }
    std::uint32_t drawn = below(all);
    for (const Choice& choice : choices) {
        if (drawn < choice.weight) {
            (this->*choice.deed)();
            return;
        }
        drawn -= choice.weight;
    }
    syncAll();
}

std::uint32_t TreeWriter::below(std::size_t limit) {
    return static_cast<std::uint32_t>(random_() % limit);
}

std::string TreeWriter::newName(const char* prefix) {
    return prefix + std::to_string(names_++);
}

std::string TreeWriter::contents() {
    constexpr std::size_t longest = 20'000;
    return std::string(below(longest), static_cast<char>('a' + below(26)));
}

std::string TreeWriter::anySubfolder() {
    std::vector<std::string> folders;
    for (const auto& [path, state] : treeBelow(root_)) {
        if (state.isFolder) {
            folders.push_back(root_ + "/" + path);
        }
    }
    return folders.empty() ? "" : folders[below(folders.size())];
}

std::string TreeWriter::anyFolder() {
    const std::string folder = below(2) == 0 ? anySubfolder() : "";
    return folder.empty() ? root_ : folder;
}

std::string TreeWriter::anyPlainFile() {
    std::vector<std::string> files;
    for (const auto& [path, state] : treeBelow(root_)) {
        if (!state.isFolder && !isSaved(path)) {
            files.push_back(root_ + "/" + path);
        }
    }
    return files.empty() ? "" : files[below(files.size())];
}

void TreeWriter::make() {
    writeFile(anyFolder() + "/" + newName("f"), contents());
}

void TreeWriter::append() {
    const std::string path = anyPlainFile();
    if (path.empty()) {
        return;
    }
    const auto file = opened(path, O_WRONLY | O_APPEND);
    const std::string more = contents() + "!";
    check(::write(file.get(), more.data(), more.size()) > 0, path);
}

void TreeWriter::overwrite() {
    const std::string path = anyPlainFile();
    if (!path.empty()) {
        writeFile(path, contents());
    }
}

void TreeWriter::changeMode() {
    const std::string path = below(3) == 0 ? anySubfolder() : anyPlainFile();
    if (!path.empty()) {
        check(::chmod(path.c_str(), 0700 + below(64)) == 0, path);
    }
}

void TreeWriter::moveFile() {
    const std::string path = anyPlainFile();
    if (!path.empty()) {
        std::filesystem::rename(path, anyFolder() + "/" + newName("f"));
    }
}

void TreeWriter::deleteFile() {
    const std::string path = anyPlainFile();
    if (path.empty()) {
        return;
    }
    const std::string name = path.substr(root_.size() + 1);
    leaving_(treeBelow(root_).at(name).key);
    std::filesystem::remove(path);
}

void TreeWriter::makeSubfolder() {
    makeFolder(anyFolder() + "/" + newName("d"));
}

void TreeWriter::moveFolder() {
    const std::string path = anySubfolder();
    if (path.empty()) {
        return;
    }
    const std::string into = anyFolder();
    if (!(into + "/").starts_with(path + "/")) {
        std::filesystem::rename(path, into + "/" + newName("d"));
    }
}

void TreeWriter::deleteFolder() {
    if (const std::string path = anySubfolder(); !path.empty()) {
        remove(path);
    }
}

void TreeWriter::remove(const std::string& folder) {
    const std::string name = folder.substr(root_.size() + 1);
    for (const auto& [path, state] : treeBelow(root_)) {
        if (path == name || path.starts_with(name + "/")) {
            leaving_(state.key);
        }
    }
    std::filesystem::remove_all(folder);
}

void TreeWriter::makeMany() {
    constexpr int files = 2'000;
    constexpr std::size_t longName = 240;
    if (!many_.empty() && std::filesystem::exists(many_)) {
        remove(many_);
    }
    many_ = root_ + "/" + newName("d");
    makeFolder(many_);
    for (int i = 0; i < files; ++i) {
        std::string name = newName("f");
        name.resize(longName, 'n');
        (void)opened(many_ + "/" + name, O_WRONLY | O_CREAT);
    }
}

void TreeWriter::save() {
    const std::string name = savedPrefix + std::to_string(below(savedNames));
    const Tree tree = treeBelow(root_);
    if (const auto old = tree.find(name); old != tree.end()) {
        leaving_(old->second.key);
    }
    const std::string next = root_ + "/" + newName(".new");
    writeFile(next, contents());
    if (below(2) == 0) {
        ::syscall(SYS_fsync, opened(next, O_RDONLY).get());
    }
    std::filesystem::rename(next, root_ + "/" + name);
}

void TreeWriter::syncFile() {
    const std::string path = anyPlainFile();
    if (!path.empty()) {
        check(::syscall(SYS_fsync, opened(path, O_RDONLY).get()) == 0, path);
    }
}

void TreeWriter::syncAll() const {
    check(::syncfs(opened(root_, O_RDONLY).get()) == 0, root_);
}

}  // namespace marrowdale::tests
