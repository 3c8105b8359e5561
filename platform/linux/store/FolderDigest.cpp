#include "platform/linux/store/FolderDigest.h"

#include <array>
#include <cstddef>
#include <span>
#include <string_view>
#include <sys/xattr.h>
#include <vector>

#include "platform/linux/files/CRC32C.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view userPrefix = "user.";

std::uint32_t addText(std::string_view text, std::uint32_t sum) {
    return crc32c(std::as_bytes(std::span(text)), sum);
}

std::uint32_t addValue(int folder, const char* name, std::uint32_t sum) {
    constexpr std::size_t largestValue = 65'536;
    std::vector<char> value(largestValue);
    const ssize_t size = ::fgetxattr(folder, name, value.data(), value.size());
    return size > 0 ? addText({value.data(), static_cast<std::size_t>(size)}, sum) : sum;
}

// The names come in the order in which the file system keeps them, which stays while they do.
std::uint32_t addAttributes(int folder, std::uint32_t sum) {
    std::array<char, 1024> few{};
    std::vector<char> many;
    std::span<char> room(few);
    ssize_t size = ::flistxattr(folder, room.data(), room.size());
    if (size < 0) {
        constexpr std::size_t mostNames = 65'536;
        many.resize(mostNames);
        room = many;
        size = ::flistxattr(folder, room.data(), room.size());
    }
    std::string_view names(room.data(), size > 0 ? static_cast<std::size_t>(size) : 0);
    while (!names.empty()) {
        const auto end = names.find('\0');
        const std::string_view name = names.substr(0, end);
        if (name.starts_with(userPrefix)) {
            // NOLINTNEXTLINE(bugprone-suspicious-stringview-data-usage): a NUL ends each name
            sum = addValue(folder, name.data(), addText(name, sum));
        }
        names.remove_prefix(end == std::string_view::npos ? names.size() : end + 1);
    }
    return sum;
}

}  // namespace

std::uint32_t folderDigest(int folder, const EntryStatus& status) {
    const std::array<std::uint32_t, 3> own{status.mode, status.owner, status.group};
    std::uint32_t sum = crc32c(std::as_bytes(std::span(own)));
    if (folder >= 0) {
        sum = addAttributes(folder, sum);
    }
    return sum == 0 ? 1 : sum;
}

}  // namespace marrowdale::native
