#include "host/daemon/LibraryChanges.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <iterator>
#include <unistd.h>
#include <utility>

#include "host/daemon/AnchorVersions.h"
#include "host/daemon/LibraryList.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

constexpr const char* fileName = "app-libraries.changes";
constexpr const char* unknownField = "unknownVersions";
constexpr const char* nowField = "libraries";
constexpr const char* changesField = "changes";
constexpr const char* throughField = "throughVersion";
constexpr const char* lastField = "lastEvent";
constexpr const char* goneField = "gone";
constexpr char itemPrefix = '#';

URL in(const std::string& folder, const char* name) {
    return URL::fileURL(folder + "/" + name);
}

// Identifiers are names of files: bytes.
PropertyList encoded(const std::vector<std::string>& identifiers) {
    PropertyListArray array;
    for (const std::string& identifier : identifiers) {
        array.emplace_back(Data::fromText(identifier));
    }
    return array;
}

const PropertyList* fieldIn(const PropertyListDictionary& fields, const char* name) {
    const auto field = fields.find(name);
    return field == fields.end() ? nullptr : &field->second;
}

std::optional<std::uint64_t> numberIn(const PropertyListDictionary& fields, const char* name) {
    const auto* field = fieldIn(fields, name);
    return field ? field->asUnsigned() : std::nullopt;
}

std::optional<std::vector<std::string>> identifiersIn(const PropertyListDictionary& fields,
                                                      const char* name) {
    const auto* field = fieldIn(fields, name);
    const auto* array = field ? field->as<PropertyListArray>() : nullptr;
    if (!array) {
        return std::nullopt;
    }
    std::vector<std::string> identifiers;
    for (const PropertyList& each : *array) {
        const auto* bytes = each.as<Data>();
        if (!bytes) {
            return std::nullopt;
        }
        identifiers.emplace_back(bytes->text());
    }
    return identifiers;
}

// Where there is no room for another file: within the block that the file has. Half of it is no
// list.
Expected<void> overwrite(const std::string& path, const Data& contents) {
    const auto failed = [&path] { return Unexpected(errorWithPOSIXCode(errno, "write", path)); };
    const native::UniqueFD file(::open(path.c_str(), O_WRONLY | O_NOFOLLOW | O_CLOEXEC));
    const auto bytes = contents.bytes();
    if (!file) {
        return failed();
    }
    const ssize_t written = ::pwrite(file.get(), bytes.data(), bytes.size(), 0);
    if (written >= 0 && static_cast<std::size_t>(written) < bytes.size()) {
        errno = ENOSPC;
        return failed();
    }
    if (written < 0 || ::ftruncate(file.get(), written) != 0 || ::fsync(file.get()) != 0) {
        return failed();
    }
    return {};
}

std::vector<std::string> sorted(std::vector<std::string> identifiers) {
    std::ranges::sort(identifiers);
    return identifiers;
}

}  // namespace

LibraryChanges::LibraryChanges(const std::string& stateFolder, const std::string& dataHome,
                               Log* log)
    : log_(log),
      fileURL_(in(stateFolder, fileName)),
      listURL_(in(dataHome, mainLibraryListName)),
      state_(stateFolder),
      lists_(dataHome) {}

LibraryList LibraryChanges::list() const {
    const auto file = lists_.read(listURL_);
    return file ? libraryListIn(*file) : LibraryList();
}

void LibraryChanges::begin(const std::vector<std::string>& identifiers, EventID last) {
    const MutexLock lock(mutex_);
    const LibraryList newest = list();
    const std::uint64_t version = newest.version;
    isWritten_ = read();
    const auto isLater = [version](const Change& change) { return change.through > version + 1; };
    // Of a list that was lost, or of none.
    if (!isWritten_ || unknown_ > version || std::ranges::any_of(changes_, isLater)) {
        changes_.clear();
        unknown_ = version == 0 ? 0 : version - 1;
        isWritten_ = false;
        // What the newest version has, of which somebody may hold an anchor.
        now_ = newest.identifiers;
    }
    if (now_ != sorted(identifiers)) {
        add(sorted(identifiers), last);
    }
}

void LibraryChanges::note(const std::vector<std::string>& identifiers, EventID last) {
    const MutexLock lock(mutex_);
    if (now_ != sorted(identifiers)) {
        add(sorted(identifiers), last);
    }
}

// A refresh that read the registry before this change may be about to write the next version.
void LibraryChanges::add(std::vector<std::string> identifiers, EventID last) {
    Change change{.through = list().version + 1, .last = last, .gone = {}};
    std::ranges::set_difference(now_, identifiers, std::back_inserter(change.gone));
    changes_.push_back(std::move(change));
    now_ = std::move(identifiers);
    forgetOld();
    write();
}

void LibraryChanges::forgetOld() {
    while (changes_.size() > most) {
        unknown_ = std::max(unknown_, changes_.front().through);
        changes_.pop_front();
    }
    const std::uint64_t unknown = unknown_;
    std::erase_if(changes_, [unknown](const Change& change) { return change.through <= unknown; });
}

void LibraryChanges::listIsKnown() {
    const LibraryList known = list();
    const MutexLock lock(mutex_);
    if (known.version != 0 && known.identifiers == now_) {
        for (Change& change : changes_) {
            if (change.through == known.version) {
                --change.through;
                isWritten_ = false;
            }
        }
        forgetOld();
    }
    if (!isWritten_) {
        write();
    }
}

std::optional<LibraryChanges::Bridge> LibraryChanges::bridge(const Data& anchor) const {
    const auto version = libraryVersionIn(anchor);
    const auto event = eventIn(anchor);
    const std::uint64_t newest = list().version;
    const MutexLock lock(mutex_);
    if (!version || !event || *version == 0 || *version <= unknown_ || *version > newest) {
        return std::nullopt;
    }
    Bridge bridge;
    EventID since = *event;
    std::set<std::string> known(now_.begin(), now_.end());
    for (const Change& change : changes_) {
        if (change.through >= *version) {
            since = std::min(since, change.last);
            known.insert(change.gone.begin(), change.gone.end());
        }
    }
    for (const std::string& identifier : known) {
        bridge.known.insert(itemPrefix + identifier);
    }
    bridge.isMoved = since != *event;
    bridge.anchor = withoutLibraryVersion(bridge.isMoved ? withEvent(anchor, since) : anchor);
    return bridge;
}

bool LibraryChanges::read() {
    const auto file = state_.read(fileURL_);
    const auto list = file ? decodePropertyList(file->bytes()) : Unexpected(file.error());
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    const auto unknown = fields ? numberIn(*fields, unknownField) : std::nullopt;
    auto now = fields ? identifiersIn(*fields, nowField) : std::nullopt;
    const auto* field = fields ? fieldIn(*fields, changesField) : nullptr;
    const auto* changes = field ? field->as<PropertyListArray>() : nullptr;
    if (!unknown || !now || !changes) {
        return false;
    }
    std::deque<Change> noted;
    for (const PropertyList& each : *changes) {
        const auto* change = each.as<PropertyListDictionary>();
        const auto through = change ? numberIn(*change, throughField) : std::nullopt;
        const auto last = change ? numberIn(*change, lastField) : std::nullopt;
        auto gone = change ? identifiersIn(*change, goneField) : std::nullopt;
        if (!through || !last || !gone) {
            return false;
        }
        noted.push_back({*through, EventID{*last}, std::move(*gone)});
    }
    unknown_ = *unknown;
    now_ = std::move(*now);
    changes_ = std::move(noted);
    return true;
}

void LibraryChanges::write() {
    PropertyListArray changes;
    for (const Change& change : changes_) {
        changes.emplace_back(PropertyListDictionary{{throughField, PropertyList(change.through)},
                                                    {lastField, PropertyList(raw(change.last))},
                                                    {goneField, encoded(change.gone)}});
    }
    const auto file = encodePropertyList(
        PropertyList(PropertyListDictionary{{unknownField, PropertyList(unknown_)},
                                            {nowField, encoded(now_)},
                                            {changesField, PropertyList(std::move(changes))}}));
    auto written = file ? state_.replace(fileURL_, *file) : Unexpected(file.error());
    if (file && !written && overwrite(fileURL_.path(), *file)) {
        written = {};
    }
    isWritten_ = written.has_value();
    if (isWritten_) {
        return;
    }
    if (log_) {
        log_->error("can't note how the app libraries change; " + written.error().description());
    }
    // What is there lacks this change.
    if (::unlink(fileURL_.path().c_str()) != 0 && errno != ENOENT && log_) {
        log_->error("nor remove what was noted earlier; " +
                    errorWithPOSIXCode(errno, "remove", fileURL_.path()).description());
    }
}

}  // namespace marrowdale::host
