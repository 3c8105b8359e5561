#include "platform/testing/TestFiles.h"

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sys/xattr.h>
#include <system_error>
#include <thread>

#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale {
namespace {

[[noreturn]] void fail(const std::string& path) {
    throw std::system_error(errno, std::generic_category(), path);
}

}  // namespace

void writeFile(const std::string& path, std::string_view contents) {
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file.write(contents.data(), static_cast<std::streamsize>(contents.size()));
    file.close();
    if (!file) {
        fail(path);
    }
}

std::string readFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        fail(path);
    }
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void makeFolder(const std::string& path) {
    std::filesystem::create_directories(path);
}

void setAttribute(const std::string& path, const std::string& name, std::string_view value) {
    if (::lsetxattr(path.c_str(), name.c_str(), value.data(), value.size(), 0) != 0) {
        fail(path);
    }
}

std::optional<std::string> attribute(const std::string& path, const std::string& name) {
    std::string value(65536, '\0');
    const ssize_t size = ::lgetxattr(path.c_str(), name.c_str(), value.data(), value.size());
    if (size < 0) {
        if (errno == ENODATA) {
            return std::nullopt;
        }
        fail(path);
    }
    value.resize(static_cast<std::size_t>(size));
    return value;
}

bool keepsUserAttributes(const std::string& folder) {
    const TemporaryDirectory probe(folder);
    return ::lsetxattr(probe.path().c_str(), "user.marrowdale.probe", "", 0, 0) == 0;
}

std::string programFolder() {
    return std::filesystem::read_symlink("/proc/self/exe").parent_path().string();
}

bool waitUntil(const std::function<bool()>& condition, std::chrono::milliseconds deadline) {
    const auto end = std::chrono::steady_clock::now() + deadline;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= end) {
            return condition();
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

}  // namespace marrowdale
