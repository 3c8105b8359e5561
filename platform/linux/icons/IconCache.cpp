#include "platform/linux/icons/IconCache.h"

#include <array>
#include <atomic>
#include <cinttypes>
#include <cstdio>
#include <filesystem>
#include <system_error>
#include <unistd.h>
#include <utility>
#include <vector>

#include "platform/foundation/URL.h"
#include "platform/linux/files/LinuxApplicationSupport.h"
#include "platform/linux/icons/CachedBitmap.h"

namespace marrowdale::native {

namespace {

namespace fs = std::filesystem;

// FNV-1a with 64 bits, from two beginnings: no two of a few thousand keys share a name.
std::uint64_t hash(std::string_view text, std::uint64_t value) {
    constexpr std::uint64_t prime = 0x100000001b3;
    for (const char character : text) {
        value = (value ^ static_cast<std::uint8_t>(character)) * prime;
    }
    return value;
}

bool holdsTooMany(const fs::path& folder) {
    std::error_code failed;
    std::size_t count = 0;
    for (auto each = fs::directory_iterator(folder, failed);
         !failed && each != fs::directory_iterator() && count <= IconCache::mostFiles;
         each.increment(failed)) {
        ++count;
    }
    return count > IconCache::mostFiles;
}

}  // namespace

IconCache::IconCache(std::string folder) : folder_(std::move(folder)) {
    if (!folder_.empty() && holdsTooMany(folder_)) {
        std::error_code failed;
        fs::remove_all(folder_, failed);
    }
}

std::string IconCache::fileFor(std::string_view key) const {
    std::array<char, 40> name{};
    std::snprintf(name.data(), name.size(), "%016" PRIx64 "%016" PRIx64 ".bmp",
                  hash(key, 0xcbf29ce484222325), hash(key, 0x6c62272e07bb0142));
    return folder_ + "/" + name.data();
}

std::optional<Data> IconCache::find(std::string_view key) const {
    if (folder_.empty()) {
        return std::nullopt;
    }
    auto data = LinuxApplicationSupport({}).read(URL::fileURL(fileFor(key)));
    return data && isCachedBitmap(*data) ? std::optional(*std::move(data)) : std::nullopt;
}

void IconCache::keep(std::string_view key, const Data& bitmap) const {
    if (folder_.empty()) {
        return;
    }
    std::error_code failed;
    fs::create_directories(folder_, failed);
    // Never half a file under its name; that it outlives a loss of power is not needed.
    static std::atomic<unsigned> number = 0;
    const std::string file = fileFor(key);
    const std::string aside =
        file + "." + std::to_string(::getpid()) + "." + std::to_string(++number);
    std::FILE* const out = std::fopen(aside.c_str(), "wbxe");
    if (out == nullptr) {
        return;
    }
    const auto bytes = bitmap.bytes();
    const bool isWritten = std::fwrite(bytes.data(), 1, bytes.size(), out) == bytes.size();
    const bool isClosed = std::fclose(out) == 0;
    if (!isWritten || !isClosed || std::rename(aside.c_str(), file.c_str()) != 0) {
        (void)std::remove(aside.c_str());
    }
}

}  // namespace marrowdale::native
