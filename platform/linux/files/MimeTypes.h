#pragma once

#include <deque>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/linux/files/MimeGlobs.h"

namespace marrowdale::native {

// The MIME types of this system, from the data that shared-mime-info installs (`globs2`,
// `subclasses`, `aliases`). Read at construction, immutable afterwards: any thread, no lock.
// Folders and files that are not there, and lines that make no sense, are passed over; without any
// data every name is application/octet-stream.
class MimeTypes {
  public:
    static constexpr std::string_view unknown = "application/octet-stream";
    static constexpr std::string_view directory = "inode/directory";
    static constexpr std::string_view symbolicLink = "inode/symlink";
    static constexpr std::string_view pipe = "inode/fifo";
    static constexpr std::string_view socket = "inode/socket";
    static constexpr std::string_view characterDevice = "inode/chardevice";
    static constexpr std::string_view blockDevice = "inode/blockdevice";

    // The `mime` folders of XDG_DATA_HOME and XDG_DATA_DIRS, the one that counts most first.
    [[nodiscard]] static std::vector<std::string> systemFolders();

    explicit MimeTypes(const std::vector<std::string>& folders = systemFolders());
    MimeTypes(const MimeTypes&) = delete;
    MimeTypes& operator=(const MimeTypes&) = delete;

    // The type that a file's name tells; the file is not looked at. The text lives as long as this
    // object.
    [[nodiscard]] std::string_view typeForName(std::string_view name) const;

    // Whether `type` is `super` or a kind of it, aliases resolved. Every text/… is a text/plain,
    // everything but inode/… an application/octet-stream.
    [[nodiscard]] bool conformsTo(std::string_view type, std::string_view super) const;

  private:
    using Parents = std::unordered_map<std::string_view, std::vector<std::string_view>>;

    [[nodiscard]] std::string_view intern(std::string_view type);
    void readGlobs(const std::vector<std::string>& folders);
    void readSubclasses(const std::string& folder);
    void readAliases(const std::string& folder);
    [[nodiscard]] std::string_view unaliased(std::string_view type) const;

    std::deque<std::string> texts_;  // what every view below points into
    std::unordered_map<std::string_view, std::string_view> interned_;
    MimeGlobs globs_;
    Parents parents_;
    std::unordered_map<std::string_view, std::string_view> aliases_;
};

}  // namespace marrowdale::native
