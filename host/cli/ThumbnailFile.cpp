#include "host/cli/ThumbnailFile.h"

#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <filesystem>
#include <span>
#include <system_error>
#include <unistd.h>

#include <fmt/format.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

constexpr mode_t newFileMode = 0666;  // what the user's umask leaves of it

bool hasItsPlaceInAName(char character) {
    const auto byte = static_cast<unsigned char>(character);
    constexpr unsigned char firstPrintable = 0x20;
    constexpr unsigned char deleteControl = 0x7F;
    return character != '/' && character != '%' && byte >= firstPrintable && byte != deleteControl;
}

Expected<void> writeAll(int file, std::span<const std::uint8_t> bytes, const std::string& path) {
    while (!bytes.empty()) {
        const ssize_t count = ::write(file, bytes.data(), bytes.size());
        if (count < 0 && errno != EINTR) {
            return Unexpected(errorWithPOSIXCode(errno, "write", path));
        }
        bytes = bytes.subspan(static_cast<std::size_t>(count < 0 ? 0 : count));
    }
    return {};
}

// Under a hidden name beside the other, so that nobody ever sees half a picture.
Expected<void> writeThenRename(const std::string& hidden, const std::string& path,
                               const Data& picture) {
    const native::UniqueFD file(
        ::open(hidden.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, newFileMode));
    if (!file) {
        return Unexpected(errorWithPOSIXCode(errno, "write", path));
    }
    auto done = writeAll(file.get(), picture.bytes(), path);
    if (done && ::rename(hidden.c_str(), path.c_str()) != 0) {
        done = Unexpected(errorWithPOSIXCode(errno, "write", path));
    }
    if (!done) {
        ::unlink(hidden.c_str());
    }
    return done;
}

}  // namespace

std::string thumbnailFileName(std::string_view identifier) {
    std::string name;
    for (const char character : identifier) {
        if (hasItsPlaceInAName(character)) {
            name += character;
        } else {
            name += fmt::format("%{:02X}", static_cast<unsigned char>(character));
        }
    }
    return name + ".png";
}

Expected<std::string> writeThumbnail(const std::string& folder, std::string_view identifier,
                                     const Data& picture) {
    std::error_code failed;
    std::filesystem::create_directories(folder, failed);
    if (failed) {
        return Unexpected(errorWithPOSIXCode(failed.value(), "make the folder", folder));
    }
    const std::string path =
        (folder.ends_with('/') ? folder : folder + "/") + thumbnailFileName(identifier);
    const std::string hidden = fmt::format("{}/.marrowdale-thumbnail-{}", folder, ::getpid());
    if (auto written = writeThenRename(hidden, path, picture); !written) {
        return Unexpected(written.error());
    }
    return path;
}

}  // namespace marrowdale::host
