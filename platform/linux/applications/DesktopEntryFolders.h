#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/linux/applications/ApplicationPlaces.h"
#include "platform/linux/applications/DesktopEntry.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// One desktop entry where it was found.
struct FoundEntry {
    std::string identifier;
    ApplicationKind kind = ApplicationKind::system;
    std::string path;
    // Null for an entry that can't be read, or is none.
    std::shared_ptr<const DesktopEntry> entry;
};

// Goes through folders of desktop entries. An entry's identifier is its path below its folder, with
// "-" for "/" and without ".desktop"; only those that can name a folder are taken. What was read of
// a file is kept for as long as the file stays the same.
//
// Files that may be links (as exports are), but never pipes, devices or folders; nothing is waited
// for. A file above `largestEntry` counts as one that can't be read. One thread.
class DesktopEntryFolders {
  public:
    static constexpr std::size_t largestEntry = std::size_t{1} << 20U;
    // Folders in folders, and entries in one folder, beyond which nothing is looked at.
    static constexpr unsigned deepest = 8;
    static constexpr std::size_t mostEntries = 65'536;

    explicit DesktopEntryFolders(std::string locale) : locale_(std::move(locale)) {}

    // By identifier; what stands in an earlier folder hides what a later one has, also when it says
    // itself that it is hidden or no application: then there is none of that identifier. Links to
    // nothing, and folders that can't be read, are passed over.
    using Entries = std::map<std::string, FoundEntry, std::less<>>;
    [[nodiscard]] Entries read(const std::vector<ApplicationFolder>& folders);

    // What the file at that path says now; null when it can't be read or is no entry.
    enum class Presence : std::uint8_t { present, missing };
    struct Look {
        Presence presence = Presence::missing;
        std::shared_ptr<const DesktopEntry> entry;
    };
    [[nodiscard]] Look look(const std::string& path);

    // How many files were read so far, rather than taken as they were.
    [[nodiscard]] std::uint64_t filesRead() const { return filesRead_; }

  private:
    struct Known {
        DeviceID device{};
        FileID fileID{};
        std::uint64_t size = 0;
        Date modified;
        Date changed;
        std::shared_ptr<const DesktopEntry> entry;

        [[nodiscard]] bool isOf(const EntryStatus& status) const;
    };
    void readFolder(const ApplicationFolder& folder, const std::string& path,
                    const std::string& prefix, unsigned depth, Entries& entries);
    [[nodiscard]] Look lookIn(int folder, const char* name, const std::string& path);
    [[nodiscard]] std::shared_ptr<const DesktopEntry> readEntry(int folder, const char* name,
                                                                bool& isFile);

    const std::string locale_;
    std::map<std::string, Known> known_;  // by path
    std::uint64_t filesRead_ = 0;
};

}  // namespace marrowdale::native
