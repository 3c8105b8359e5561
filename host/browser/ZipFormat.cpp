#include "host/browser/ZipFormat.h"

#include <algorithm>
#include <ctime>
#include <limits>
#include <string_view>
#include <sys/stat.h>
#include <utility>

#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

namespace {

constexpr std::uint64_t most32 = std::numeric_limits<std::uint32_t>::max();
constexpr std::uint64_t most16 = std::numeric_limits<std::uint16_t>::max();

constexpr std::uint32_t headSign = 0x04034b50;
constexpr std::uint32_t tailSign = 0x08074b50;
constexpr std::uint32_t recordSign = 0x02014b50;
constexpr std::uint32_t endSign = 0x06054b50;
constexpr std::uint32_t largeEndSign = 0x06064b50;
constexpr std::uint32_t largeEndPlaceSign = 0x07064b50;

constexpr std::uint16_t versionOfFolders = 20;
constexpr std::uint16_t versionOfLarge = 45;
constexpr std::uint16_t unixSystem = 3U << 8U;
// Sizes follow the content; names are UTF-8.
constexpr std::uint16_t flags = (1U << 3U) | (1U << 11U);
constexpr std::uint16_t stored = 0;
constexpr std::uint16_t largeExtra = 0x0001;
constexpr std::uint16_t timeExtra = 0x5455;

// Numbers with their lowest byte first.
class Bytes {
  public:
    template <typename Number>
    Bytes& add(Number number) {
        std::uint64_t rest = number;
        for (std::size_t i = 0; i < sizeof number; ++i) {
            text_ += static_cast<char>(rest & 0xFFU);
            rest >>= 8U;
        }
        return *this;
    }
    Bytes& add16(std::uint64_t number) { return add(static_cast<std::uint16_t>(number)); }
    Bytes& add32(std::uint64_t number) { return add(static_cast<std::uint32_t>(number)); }
    // The number, or the highest one, which says that it stands elsewhere.
    Bytes& addUpTo32(std::uint64_t number) { return add32(std::min(number, most32)); }
    Bytes& addUpTo16(std::uint64_t number) { return add16(std::min(number, most16)); }
    Bytes& addText(std::string_view text) {
        text_ += text;
        return *this;
    }
    [[nodiscard]] std::string take() { return std::move(text_); }

  private:
    std::string text_;
};

bool isLarge(const ZipEntry& entry) {
    return entry.longestSize >= most32;
}

struct OldTime {
    std::uint16_t time = 0;
    std::uint16_t date = 0;
};

// The clock on the wall, in steps of two seconds from 1980 on.
OldTime oldTimeOf(const Date& date) {
    constexpr int firstYear = 80;
    constexpr int lastYear = firstYear + 127;
    const std::time_t seconds = date.seconds;
    std::tm parts{};
    if (::localtime_r(&seconds, &parts) == nullptr || parts.tm_year < firstYear ||
        parts.tm_year > lastYear) {
        return {.time = 0, .date = (1U << 5U) | 1U};
    }
    const auto part = [](int value) { return static_cast<unsigned>(value); };
    return {
        .time = static_cast<std::uint16_t>((part(parts.tm_hour) << 11U) |
                                           (part(parts.tm_min) << 5U) | (part(parts.tm_sec) / 2)),
        .date = static_cast<std::uint16_t>((part(parts.tm_year - firstYear) << 9U) |
                                           (part(parts.tm_mon + 1) << 5U) | part(parts.tm_mday))};
}

// The time as seconds since 1970, where it fits.
std::string timeField(const ZipEntry& entry) {
    constexpr std::uint16_t length = 5;
    constexpr std::uint8_t onlyModified = 1;
    if (entry.modified.seconds < 0 ||
        entry.modified.seconds > std::numeric_limits<std::int32_t>::max()) {
        return {};
    }
    return Bytes()
        .add(timeExtra)
        .add(length)
        .add(onlyModified)
        .add32(static_cast<std::uint64_t>(entry.modified.seconds))
        .take();
}

std::string largeField(std::initializer_list<std::uint64_t> numbers) {
    if (numbers.size() == 0) {
        return {};
    }
    Bytes bytes;
    bytes.add(largeExtra).add16(numbers.size() * sizeof(std::uint64_t));
    for (const std::uint64_t number : numbers) {
        bytes.add(number);
    }
    return bytes.take();
}

// Those of a directory's record that don't fit into it.
std::string largeFieldOf(const ZipEntry& entry) {
    const bool isFar = entry.offset >= most32;
    if (isLarge(entry)) {
        return isFar ? largeField({entry.size, entry.size, entry.offset})
                     : largeField({entry.size, entry.size});
    }
    return isFar ? largeField({entry.offset}) : std::string();
}

std::uint16_t versionOf(const ZipEntry& entry) {
    return isLarge(entry) || entry.offset >= most32 ? versionOfLarge : versionOfFolders;
}

}  // namespace

std::string zipHead(const ZipEntry& entry) {
    const OldTime time = oldTimeOf(entry.modified);
    const std::string extra =
        (isLarge(entry) ? largeField({0, 0}) : std::string()) + timeField(entry);
    const std::uint64_t unknown = isLarge(entry) ? most32 : 0;
    return Bytes()
        .add(headSign)
        .add(isLarge(entry) ? versionOfLarge : versionOfFolders)
        .add(flags)
        .add(stored)
        .add(time.time)
        .add(time.date)
        .add32(0)
        .add32(unknown)
        .add32(unknown)
        .add16(entry.name.size())
        .add16(extra.size())
        .addText(entry.name)
        .addText(extra)
        .take();
}

std::string zipTail(const ZipEntry& entry) {
    Bytes bytes;
    bytes.add(tailSign).add(entry.checksum);
    if (isLarge(entry)) {
        bytes.add(entry.size).add(entry.size);
    } else {
        bytes.add32(entry.size).add32(entry.size);
    }
    return bytes.take();
}

std::string zipDirectoryRecord(const ZipEntry& entry) {
    constexpr std::uint32_t oldFolderMark = 0x10;
    const OldTime time = oldTimeOf(entry.modified);
    const std::string extra = largeFieldOf(entry) + timeField(entry);
    const std::uint64_t size = isLarge(entry) ? most32 : entry.size;
    const std::uint32_t attributes =
        (entry.mode << 16U) | (S_ISDIR(entry.mode) ? oldFolderMark : 0);
    return Bytes()
        .add(recordSign)
        .add(static_cast<std::uint16_t>(unixSystem | versionOf(entry)))
        .add(versionOf(entry))
        .add(flags)
        .add(stored)
        .add(time.time)
        .add(time.date)
        .add(entry.checksum)
        .add32(size)
        .add32(size)
        .add16(entry.name.size())
        .add16(extra.size())
        .add16(0)  // comment
        .add16(0)  // disk
        .add16(0)  // internal attributes
        .add(attributes)
        .addUpTo32(entry.offset)
        .addText(entry.name)
        .addText(extra)
        .take();
}

std::string zipEnd(std::uint64_t records, std::uint64_t directorySize,
                   std::uint64_t directoryOffset) {
    Bytes bytes;
    if (records >= most16 || directorySize >= most32 || directoryOffset >= most32) {
        constexpr std::uint64_t restOfLargeEnd = 44;
        bytes.add(largeEndSign)
            .add(restOfLargeEnd)
            .add(static_cast<std::uint16_t>(unixSystem | versionOfLarge))
            .add(versionOfLarge)
            .add32(0)
            .add32(0)
            .add(records)
            .add(records)
            .add(directorySize)
            .add(directoryOffset);
        bytes.add(largeEndPlaceSign).add32(0).add(directoryOffset + directorySize).add32(1);
    }
    return bytes.add(endSign)
        .add16(0)
        .add16(0)
        .addUpTo16(records)
        .addUpTo16(records)
        .addUpTo32(directorySize)
        .addUpTo32(directoryOffset)
        .add16(0)
        .take();
}

std::string zipNamePart(std::string_view name) {
    std::string plain;
    while (!name.empty()) {
        const std::size_t length = leadingCharacter(name).length;
        const std::string_view character = name.substr(0, std::max<std::size_t>(length, 1));
        const bool isText = length > 0 && isHarmless(character) && character != "\\";
        plain += isText ? character : std::string_view("_");
        name.remove_prefix(character.size());
    }
    return plain == "." || plain == ".." ? "_" : plain;
}

}  // namespace marrowdale::host
