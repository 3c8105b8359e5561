#pragma once

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <sys/mman.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <vector>

#include "platform/linux/files/UniqueFD.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {

// The operations of event sequences (sequences/README.md), for tests. What the system refuses
// throws std::system_error.
class WatcherTestOperations {
  public:
    // `at` makes a path of an argument.
    explicit WatcherTestOperations(std::function<std::string(const std::string&)> at)
        : at_(std::move(at)) {}

    // The operation and its arguments.
    void run(const std::vector<std::string>& words) {
        const auto found = operations_.find(words.at(0));
        if (found == operations_.end()) {
            throw std::runtime_error("no such operation: " + words[0]);
        }
        found->second(words);
    }

  private:
    using Words = std::vector<std::string>;

    static int checked(int result, const std::string& what) {
        if (result < 0) {
            throw std::system_error(errno, std::generic_category(), what);
        }
        return result;
    }
    [[nodiscard]] UniqueFD open(const std::string& path, int flags) const {
        return UniqueFD(checked(::open(at_(path).c_str(), flags | O_CLOEXEC, 0644), path));
    }
    static void put(const UniqueFD& file, const std::string& text) {
        checked(static_cast<int>(::write(file.get(), text.data(), text.size())), "write");
    }
    void rename(const Words& words, unsigned flags) const {
        checked(::renameat2(AT_FDCWD, at_(words.at(1)).c_str(), AT_FDCWD, at_(words.at(2)).c_str(),
                            flags),
                words[1]);
    }
    void store(const std::string& path) const {
        const UniqueFD file = open(path, O_RDWR);
        void* memory = ::mmap(nullptr, 1, PROT_READ | PROT_WRITE, MAP_SHARED, file.get(), 0);
        checked(memory == MAP_FAILED ? -1 : 0, path);
        *static_cast<char*>(memory) = 'S';
        checked(::munmap(memory, 1), path);
    }
    void tmpfile(const std::string& folder, const std::string& path) const {
        const UniqueFD file = open(folder, O_TMPFILE | O_WRONLY);
        put(file, "text");
        const std::string own = "/proc/self/fd/" + std::to_string(file.get());
        checked(::linkat(AT_FDCWD, own.c_str(), AT_FDCWD, at_(path).c_str(), AT_SYMLINK_FOLLOW),
                path);
    }
    [[nodiscard]] const char* path(const Words& words, std::size_t index) {
        return (path_ = at_(words.at(index))).c_str();
    }

    std::function<std::string(const std::string&)> at_;
    std::string path_;
    std::vector<UniqueFD> leftOpen_;
    const std::map<std::string, std::function<void(const Words&)>> operations_{
        {"mkdir", [this](const Words& w) { checked(::mkdir(path(w, 1), 0755), w[1]); }},
        {"create", [this](const Words& w) { (void)open(w.at(1), O_WRONLY | O_CREAT | O_EXCL); }},
        {"write",
         [this](const Words& w) { put(open(w.at(1), O_WRONLY | O_CREAT | O_TRUNC), w.at(2)); }},
        {"append",
         [this](const Words& w) {
             leftOpen_.push_back(open(w.at(1), O_WRONLY | O_APPEND));
             put(leftOpen_.back(), w.at(2));
         }},
        {"store", [this](const Words& w) { store(w.at(1)); }},
        {"chmod",
         [this](const Words& w) {
             const auto mode = static_cast<mode_t>(std::stoul(w.at(2), nullptr, 8));
             checked(::chmod(path(w, 1), mode), w[1]);
         }},
        {"setxattr", [this](const Words& w) { setAttribute(path(w, 1), "user.test", "value"); }},
        {"truncate",
         [this](const Words& w) { checked(::truncate(path(w, 1), std::stol(w.at(2))), w[1]); }},
        {"rename", [this](const Words& w) { rename(w, 0); }},
        {"exchange", [this](const Words& w) { rename(w, RENAME_EXCHANGE); }},
        {"link",
         [this](const Words& w) {
             checked(::link(at_(w.at(1)).c_str(), at_(w.at(2)).c_str()), w[1]);
         }},
        {"symlink",
         [this](const Words& w) { checked(::symlink(w.at(1).c_str(), path(w, 2)), w[2]); }},
        {"unlink", [this](const Words& w) { checked(::unlink(path(w, 1)), w[1]); }},
        {"rmdir", [this](const Words& w) { checked(::rmdir(path(w, 1)), w[1]); }},
        {"fifo", [this](const Words& w) { checked(::mkfifo(path(w, 1), 0644), w[1]); }},
        {"tmpfile", [this](const Words& w) { tmpfile(w.at(1), w.at(2)); }},
    };
};

}  // namespace marrowdale::native
