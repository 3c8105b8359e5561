#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "host/browser/BrowserSite.h"
#include "host/browser/ZipFormat.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

// Items as one ZIP archive, with everything in the folders among them, made while it is read: what
// is kept is one folder's names on each level and the archive's directory, some 100 bytes a file.
//
// Content is stored as it is: over a loopback connection the time is better spent than on packing.
// Links are not followed, and left out as what is no file or folder is, what lies on another file
// system, and the trash. What is gone when its turn comes is left out, too; what can't be opened is
// named in a text at the archive's end. A file that can't be read to the end fails the archive; one
// that grows is read up to where it ended when it was opened.
//
// One thread at a time.
class ZipArchive final : public ContentSource {
  public:
    // The items' URLs and file numbers tell what they are; an item that is not the one any more
    // counts as gone. Names that are taken in the archive get a number.
    explicit ZipArchive(std::vector<FileProviderItemPtr> items);

    [[nodiscard]] Expected<std::size_t> read(std::span<char> buffer) override;

  private:
    struct Level {
        std::string path;                  // below root_; empty for that itself
        std::string name;                  // in the archive, with "/" at its end
        std::vector<std::string> waiting;  // names, the next one last
        std::set<std::string, std::less<>> taken;
    };

    // Goes on to the next thing that has bytes; false at the end.
    [[nodiscard]] bool advance();
    void beginItem(const FileProviderItem& item);
    void beginNextIn(Level& level);
    // A file or folder that is open, under that name in the archive.
    void begin(native::UniqueFD file, std::string path, std::string name);
    void beginFolder(native::UniqueFD folder, ZipEntry entry, std::string path);
    void endFile();
    void endArchive();
    void cannotOpen(int code, std::string_view name);
    void queueText(std::string name, std::string_view text);
    void queueHead(const ZipEntry& entry);
    void queue(std::string_view bytes);
    void record(const ZipEntry& entry);

    const std::vector<FileProviderItemPtr> items_;
    std::size_t nextItem_ = 0;
    native::UniqueFD root_;  // the folder among the items that is being walked
    std::vector<Level> levels_;
    std::set<std::string, std::less<>> taken_;  // names at the archive's top

    native::UniqueFD file_;  // what is being read
    std::optional<ZipEntry> entry_;
    std::string queued_;  // to be handed out before anything else
    std::size_t queuedStart_ = 0;
    std::uint64_t offset_ = 0;  // of the archive's next byte
    std::string directory_;
    std::uint64_t records_ = 0;
    std::string problems_;
    bool isEnded_ = false;
};

}  // namespace marrowdale::host
