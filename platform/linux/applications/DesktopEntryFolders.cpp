#include "platform/linux/applications/DesktopEntryFolders.h"

#include <algorithm>
#include <cerrno>
#include <dirent.h>
#include <fcntl.h>
#include <set>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view suffix = ".desktop";
constexpr std::size_t bufferBytes = std::size_t{32} << 10U;

bool isEntryName(std::string_view name) {
    return name.size() > suffix.size() && name.ends_with(suffix);
}

// An identifier names the folder of the application's data.
bool canNameAFolder(std::string_view identifier) {
    return !identifier.empty() && identifier != "." && identifier != "..";
}

// The names in a folder, sorted, so that the same folder is always gone through alike.
struct Names {
    std::vector<std::string> entries;
    std::vector<std::string> folders;
};

bool isRealFolder(int folder, const DirectoryReader::Entry& entry) {
    if (entry.type != DT_UNKNOWN) {
        return entry.type == DT_DIR;
    }
    const auto status = statEntry(folder, entry.cName());
    return status && status->isDirectory();
}

Names namesIn(DirectoryReader& reader) {
    Names names;
    while (names.entries.size() + names.folders.size() < DesktopEntryFolders::mostEntries) {
        const auto entry = reader.next();
        if (!entry || !*entry) {
            break;
        }
        if (isRealFolder(reader.descriptor(), **entry)) {
            names.folders.emplace_back((*entry)->name);
        } else if (isEntryName((*entry)->name)) {
            names.entries.emplace_back((*entry)->name);
        }
    }
    std::ranges::sort(names.entries);
    std::ranges::sort(names.folders);
    return names;
}

// At most one byte more than an entry may have; none when reading fails.
std::optional<std::string> contents(int file) {
    std::string bytes(DesktopEntryFolders::largestEntry + 1, '\0');
    std::size_t filled = 0;
    while (filled < bytes.size()) {
        const ssize_t got = ::read(file, bytes.data() + filled, bytes.size() - filled);
        if (got < 0 && errno != EINTR) {
            return std::nullopt;
        }
        if (got == 0) {
            break;
        }
        filled += got < 0 ? 0 : static_cast<std::size_t>(got);
    }
    bytes.resize(filled);
    return bytes;
}

}  // namespace

bool DesktopEntryFolders::Known::isOf(const EntryStatus& status) const {
    return status.device == device && status.fileID == fileID && status.size == size &&
           status.modified == modified && status.changed == changed;
}

DesktopEntryFolders::Entries DesktopEntryFolders::read(
    const std::vector<ApplicationFolder>& folders) {
    Entries entries;
    for (const ApplicationFolder& folder : folders) {
        readFolder(folder, folder.path, {}, 0, entries);
    }
    std::set<std::string_view> paths;
    for (const auto& [identifier, found] : entries) {
        paths.insert(found.path);
    }
    std::erase_if(known_, [&](const auto& known) { return !paths.contains(known.first); });
    std::erase_if(entries, [](const auto& named) {
        const auto& entry = named.second.entry;
        return entry && (entry->isHidden || !entry->isApplication);
    });
    return entries;
}

void DesktopEntryFolders::readFolder(const ApplicationFolder& folder, const std::string& path,
                                     const std::string& prefix, unsigned depth, Entries& entries) {
    auto opened =
        depth == 0
            ? UniqueFD(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC))
            : UniqueFD(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!opened) {
        return;
    }
    DirectoryReader reader(std::move(opened), bufferBytes);
    const Names names = namesIn(reader);
    for (const std::string& name : names.entries) {
        std::string identifier = prefix + name.substr(0, name.size() - suffix.size());
        if (!canNameAFolder(identifier) || entries.contains(identifier)) {
            continue;
        }
        std::string place = path + "/" + name;
        Look found = lookIn(reader.descriptor(), name.c_str(), place);
        if (found.presence == Presence::present) {
            FoundEntry entry{identifier, folder.kind, std::move(place), std::move(found.entry)};
            entries.emplace(std::move(identifier), std::move(entry));
        }
    }
    for (const std::string& name : depth < deepest ? names.folders : std::vector<std::string>()) {
        readFolder(folder, path + "/" + name, prefix + name + "-", depth + 1, entries);
    }
}

DesktopEntryFolders::Look DesktopEntryFolders::look(const std::string& path) {
    return lookIn(AT_FDCWD, path.c_str(), path);
}

DesktopEntryFolders::Look DesktopEntryFolders::lookIn(int folder, const char* name,
                                                      const std::string& path) {
    const auto status = statTarget(folder, name);
    if (!status || !status->isRegular()) {
        known_.erase(path);
        return {};
    }
    const auto known = known_.find(path);
    if (known != known_.end() && known->second.isOf(*status)) {
        return {Presence::present, known->second.entry};
    }
    bool isFile = true;
    auto entry = readEntry(folder, name, isFile);
    known_.erase(path);
    if (!isFile) {
        return {};
    }
    // A file that was written just now may be written again without another time.
    if (isSettled(status->changed, Date::now())) {
        known_.emplace(path, Known{status->device, status->fileID, status->size, status->modified,
                                   status->changed, entry});
    }
    return {Presence::present, std::move(entry)};
}

std::shared_ptr<const DesktopEntry> DesktopEntryFolders::readEntry(int folder, const char* name,
                                                                   bool& isFile) {
    ++filesRead_;
    const UniqueFD file(::openat(folder, name, O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    if (!file) {
        isFile = errno != ENOENT;
        return nullptr;
    }
    struct stat status{};
    isFile = ::fstat(file.get(), &status) == 0 && S_ISREG(status.st_mode);
    if (!isFile || static_cast<std::size_t>(status.st_size) > largestEntry) {
        return nullptr;
    }
    const auto bytes = contents(file.get());
    if (!bytes || bytes->size() > largestEntry) {
        return nullptr;
    }
    auto entry = parseDesktopEntry(*bytes, locale_);
    return entry ? std::make_shared<const DesktopEntry>(*std::move(entry)) : nullptr;
}

}  // namespace marrowdale::native
