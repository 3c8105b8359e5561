#pragma once

#include <cstdint>
#include <string>

#include "platform/foundation/Date.h"

namespace marrowdale::host {

// What an archive says of one thing in it.
struct ZipEntry {
    std::string name;  // UTF-8 with "/" between its parts; a folder's ends with one
    Date modified;
    std::uint32_t mode = 0;         // as stat has it
    std::uint64_t longestSize = 0;  // known before the content is: decides how sizes are written
    std::uint64_t offset = 0;       // where it begins in the archive
    // Known after the content:
    std::uint64_t size = 0;
    std::uint32_t checksum = 0;  // the format's own CRC-32
};

// The parts of a ZIP archive whose content is stored as it is and not known when it begins: before
// each content comes a head without sizes, behind it a tail with them, and at the end a directory
// of all. Sizes and places beyond 4 GiB are written in the format's 64-bit form, others in the old
// one, which everything reads.
[[nodiscard]] std::string zipHead(const ZipEntry& entry);
[[nodiscard]] std::string zipTail(const ZipEntry& entry);
[[nodiscard]] std::string zipDirectoryRecord(const ZipEntry& entry);
// What ends the archive, behind a directory of that many records and that size at that offset.
[[nodiscard]] std::string zipEnd(std::uint64_t records, std::uint64_t directorySize,
                                 std::uint64_t directoryOffset);

// One part of a name for an archive, which may be opened on any system: text, with nothing in it
// that is a separator somewhere or turns a line around.
[[nodiscard]] std::string zipNamePart(std::string_view name);

}  // namespace marrowdale::host
