#include "host/daemon/LibraryWitness.h"

#include <cstddef>
#include <unistd.h>

#include "host/daemon/LibraryList.h"
#include "platform/linux/files/CRC32C.h"

namespace marrowdale::host {

namespace {

constexpr const char* witnessName = "app-libraries.witness";

constexpr const char* markField = "mark";
constexpr const char* versionField = "version";
constexpr const char* packagesField = "packageExtensions";
constexpr const char* sizeField = "size";
constexpr const char* checksumField = "checksum";

URL in(const std::string& folder, const char* name) {
    return URL::fileURL(folder + "/" + name);
}

std::optional<std::uint64_t> numberIn(const PropertyListDictionary& fields, const char* name) {
    const auto field = fields.find(name);
    return field == fields.end() ? std::nullopt : field->second.asUnsigned();
}

std::optional<UUID> markIn(const PropertyListDictionary& fields) {
    const auto field = fields.find(markField);
    const auto* text = field == fields.end() ? nullptr : field->second.as<std::string>();
    return text ? UUID::fromText(*text) : std::nullopt;
}

}  // namespace

bool LibraryWitness::Seen::goesOnFrom(const Seen& earlier) const {
    return earlier.version == 0 || version > earlier.version || *this == earlier;
}

LibraryWitness::LibraryWitness(const std::string& stateFolder, const std::string& dataHome,
                               const std::vector<std::string>& packageExtensions, Log* log)
    : log_(log),
      state_(stateFolder),
      lists_(dataHome),
      packages_(PropertyListArray(packageExtensions.begin(), packageExtensions.end())),
      witnessURL_(in(stateFolder, witnessName)),
      mainListURL_(in(dataHome, mainLibraryListName)),
      workingSetListURL_(in(dataHome, workingSetLibraryListName)) {
    const bool isKnown = readWitness();
    const Seen now = look();
    const bool goesOn = isKnown && now.goesOnFrom(seen_);
    if (goesOn && arePackagesKnown_) {
        return;
    }
    if (isKnown && !goesOn) {
        if (log_) {
            log_->error("the list of app libraries is not the one that it was; it is made anew");
        }
        // What can't be removed is looked at by the extension, and again by the next start.
        ::unlink(mainListURL_.path().c_str());
        ::unlink(workingSetListURL_.path().c_str());
    }
    mark_ = UUID::random();
    seen_ = goesOn ? seen_ : Seen();
    write();
}

UUID LibraryWitness::marked(const UUID& history) const {
    const std::lock_guard lock(mutex_);
    UUID result = history;
    for (std::size_t i = 0; i < result.bytes.size(); ++i) {
        result.bytes.at(i) ^= mark_.bytes.at(i);
    }
    return result;
}

void LibraryWitness::lookAgain() {
    const std::lock_guard lock(mutex_);
    const Seen now = look();
    if (now == seen_) {
        return;
    }
    if (!now.goesOnFrom(seen_)) {
        mark_ = UUID::random();
        if (!isLost_) {
            isLost_ = true;
            write();
        }
    }
    seen_ = now;
    if (!isLost_) {
        write();
    }
}

LibraryWitness::Seen LibraryWitness::look() {
    const auto list = lists_.read(mainListURL_);
    if (!list) {
        return {};
    }
    const Seen seen{.version = libraryListIn(*list).version,
                    .size = list->size(),
                    .checksum = native::crc32c(std::as_bytes(list->bytes()))};
    return seen.version == 0 ? Seen() : seen;
}

bool LibraryWitness::readWitness() {
    const auto file = state_.read(witnessURL_);
    const auto list = file ? decodePropertyList(file->bytes()) : Unexpected(file.error());
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    const auto mark = fields ? markIn(*fields) : std::nullopt;
    const auto version = fields ? numberIn(*fields, versionField) : std::nullopt;
    const auto size = fields ? numberIn(*fields, sizeField) : std::nullopt;
    const auto checksum = fields ? numberIn(*fields, checksumField) : std::nullopt;
    if (!mark || !version || !size || !checksum) {
        return false;
    }
    const auto packages = fields->find(packagesField);
    arePackagesKnown_ = packages != fields->end() && packages->second == packages_;
    mark_ = *mark;
    seen_ = {.version = *version, .size = *size, .checksum = *checksum};
    return true;
}

void LibraryWitness::write() {
    const auto file = encodePropertyList(
        PropertyList(PropertyListDictionary{{markField, PropertyList(mark_.text())},
                                            {versionField, PropertyList(seen_.version)},
                                            {packagesField, packages_},
                                            {sizeField, PropertyList(seen_.size)},
                                            {checksumField, PropertyList(seen_.checksum)}}));
    const auto written = file ? state_.replace(witnessURL_, *file) : Unexpected(file.error());
    if (!written && log_) {
        log_->error("can't remember the list of app libraries; " + written.error().description());
    }
}

}  // namespace marrowdale::host
