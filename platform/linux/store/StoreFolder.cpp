#include "platform/linux/store/StoreFolder.h"

#include <array>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <span>
#include <sys/stat.h>

#include "platform/linux/files/CRC32C.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/IdentifierRange.h"
#include "platform/linux/store/SegmentWriter.h"
#include "platform/linux/store/StoreHead.h"

namespace marrowdale::native {

std::optional<std::string> StoreFolder::keyIn(std::string_view name, Part part) {
    constexpr std::string_view prefix = "store-";
    const std::string_view suffix = part == Part::unfinished ? ".new" : "";
    if (name.size() != prefix.size() + RootBinding::keySize + suffix.size() ||
        !name.starts_with(prefix) || !name.ends_with(suffix)) {
        return std::nullopt;
    }
    const std::string_view key = name.substr(prefix.size(), RootBinding::keySize);
    const bool isKey = key.find_first_not_of("0123456789abcdef") == std::string_view::npos;
    return isKey ? std::optional(std::string(key)) : std::nullopt;
}

std::string StoreFolder::segment(std::uint64_t number) const {
    return store() + "/" + segmentName(number);
}

std::string StoreFolder::witness(const std::string& cacheFolder) const {
    std::array<char, 9> place{};
    (void)std::snprintf(place.data(), place.size(), "%08x",
                        crc32c(std::as_bytes(std::span(state_))));
    return cacheFolder + "/witness-" + key_ + "-" + place.data();
}

bool StoreFolder::hasStore() const {
    struct stat found{};
    return ::lstat(store().c_str(), &found) == 0;
}

Expected<std::vector<std::uint64_t>> StoreFolder::segments() const {
    const auto names = namesIn(store());
    if (!names) {
        return Unexpected(names.error());
    }
    std::vector<std::uint64_t> numbers;
    for (const std::string& name : *names) {
        std::uint64_t number = 0;
        constexpr std::size_t prefix = 4;  // "log-"
        const bool isSegment = name.starts_with("log-");
        if (isSegment &&
            std::from_chars(name.data() + prefix, name.data() + name.size(), number).ec ==
                std::errc() &&
            segmentName(number) == name) {
            numbers.push_back(number);
        }
    }
    return numbers;
}

Expected<void> StoreFolder::sweep() const {
    if (auto removed = removeTree(unfinished()); !removed) {
        return removed;
    }
    if (auto removed = removeFile(identity() + ".new"); !removed) {
        return removed;
    }
    return removeFile(snapshot() + ".new");
}

Expected<void> StoreFolder::create(const StoreIdentity& identity) const {
    const std::string folder = unfinished();
    if (auto removed = removeTree(folder); !removed) {
        return removed;
    }
    if (auto done = makeFolders(folder); !done) {
        return done;
    }
    if (auto done = identity.write(folder + "/identity"); !done) {
        return done;
    }
    const std::uint32_t lastDocument = identity.firstDocument - 1;
    const auto range =
        IdentifierRange::create(folder + "/identifiers", identity.uuid, 0, lastDocument);
    if (!range) {
        return Unexpected(range.error());
    }
    const auto head = StoreHead::create(folder + "/head", identity.uuid,
                                        {1, segmentHeaderSize, 0, 0, lastDocument});
    if (!head) {
        return Unexpected(head.error());
    }
    if (auto synced = head->sync(); !synced) {
        return synced;
    }
    constexpr std::int64_t billion = 1'000'000'000;
    const auto created = static_cast<std::uint32_t>(identity.created / billion);
    const auto segment = SegmentWriter::create(folder, identity.uuid, {1, 1, 0, created});
    if (!segment) {
        return Unexpected(segment.error());
    }
    if (auto renamed = renameFile(folder, store()); !renamed) {
        return renamed;
    }
    return syncFolder(state_);
}

Expected<void> StoreFolder::rewrite(const StoreIdentity& identity) const {
    const std::string path = this->identity();
    if (auto done = identity.write(path + ".new"); !done) {
        return done;
    }
    if (auto renamed = renameFile(path + ".new", path); !renamed) {
        return renamed;
    }
    return syncFolder(store());
}

Expected<void> StoreFolder::setAside() const {
    if (auto removed = removeTree(damaged()); !removed) {
        return removed;
    }
    if (auto renamed = renameFile(store(), damaged()); !renamed) {
        return renamed;
    }
    return syncFolder(state_);
}

}  // namespace marrowdale::native
