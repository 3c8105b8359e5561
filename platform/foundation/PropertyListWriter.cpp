#include "platform/foundation/PropertyListWriter.h"

#include <bit>
#include <cerrno>
#include <limits>
#include <optional>
#include <utility>

#include "platform/foundation/PropertyListFormat.h"
#include "platform/foundation/Utf8.h"

namespace marrowdale {

using propertylist::Kind;

namespace {

// The fewest bytes, of one, two, four and eight, that hold the number.
constexpr std::size_t sizeFor(std::uint64_t number) {
    if (number <= std::numeric_limits<std::uint8_t>::max()) {
        return 1;
    }
    if (number <= std::numeric_limits<std::uint16_t>::max()) {
        return 2;
    }
    return number <= std::numeric_limits<std::uint32_t>::max() ? 4 : 8;
}

constexpr std::uint8_t firstByte(Kind kind, std::size_t lowerHalf) {
    return static_cast<std::uint8_t>((std::to_underlying(kind) << 4) |
                                     static_cast<std::uint8_t>(lowerHalf));
}

constexpr std::size_t utf16UnitCount(char32_t codePoint) {
    return codePoint < 0x10000 ? 1 : 2;
}

// Number of UTF-16 units of a text; no value when it is not UTF-8.
std::optional<std::size_t> utf16Length(std::string_view text) {
    std::size_t units = 0;
    while (!text.empty()) {
        const auto codePoint = takeCodePoint(text);
        if (!codePoint) {
            return std::nullopt;
        }
        units += utf16UnitCount(*codePoint);
    }
    return units;
}

constexpr bool canBeWritten(const Date& date) {
    return date.seconds >= propertylist::dateOrigin - propertylist::dateRange &&
           date.seconds <= propertylist::dateOrigin + propertylist::dateRange &&
           date.nanoseconds < 1'000'000'000;
}

}  // namespace

Expected<Data> PropertyListWriter::write(const PropertyList& list) {
    std::uint64_t top = 0;
    --objectsLeft_;
    bool isWritten = add(list, 0, top);
    if (isWritten) {
        bytes_.assign(propertylist::magic.begin(), propertylist::magic.end());
        referenceSize_ = sizeFor(objects_.size() - 1);
        std::vector<std::size_t> offsets;
        offsets.reserve(objects_.size());
        for (const Object& object : objects_) {
            offsets.push_back(bytes_.size());
            writeObject(object);
        }
        writeTable(offsets);
        isWritten = bytes_.size() <= limits_.bytes || fail("too long");
    }
    if (!isWritten) {
        return Unexpected(
            errorWithPOSIXCode(EINVAL, std::string("encode property list: ") + reason_, ""));
    }
    return Data(std::move(bytes_));
}

bool PropertyListWriter::fail(const char* reason) {
    reason_ = reason;
    return false;
}

bool PropertyListWriter::add(const PropertyList& list, std::size_t depth, std::uint64_t& number) {
    if (const auto* text = list.as<std::string>()) {
        return addText(*text, number);
    }
    number = objects_.size();
    objects_.push_back({&list, nullptr, 0, 0});
    if (const auto* array = list.as<PropertyListArray>()) {
        return addArray(*array, depth, number);
    }
    if (const auto* dictionary = list.as<PropertyListDictionary>()) {
        return addDictionary(*dictionary, depth, number);
    }
    if (const auto* data = list.as<Data>()) {
        return payForBytes(data->size());
    }
    const auto* date = list.as<Date>();
    return date == nullptr || canBeWritten(*date) || fail("a date out of range");
}

bool PropertyListWriter::addText(const std::string& text, std::uint64_t& number) {
    const auto units = isAscii(text) ? text.size() : utf16Length(text);
    if (!units) {
        return fail("a string that is not UTF-8");
    }
    if (!payForBytes(isAscii(text) ? text.size() : 2 * *units)) {
        return false;
    }
    const auto [entry, isNew] = texts_.try_emplace(text, objects_.size());
    number = entry->second;
    if (isNew) {
        objects_.push_back({nullptr, &text, 0, 0});
    }
    return true;
}

bool PropertyListWriter::addArray(const PropertyListArray& array, std::size_t depth,
                                  std::size_t object) {
    if (!enterContainer(array.size(), depth, object)) {
        return false;
    }
    std::size_t slot = objects_[object].firstReference;
    for (const PropertyList& element : array) {
        std::uint64_t number = 0;
        if (!add(element, depth + 1, number)) {
            return false;
        }
        references_[slot++] = number;
    }
    return true;
}

bool PropertyListWriter::addDictionary(const PropertyListDictionary& dictionary, std::size_t depth,
                                       std::size_t object) {
    if (!enterContainer(2 * dictionary.size(), depth, object)) {
        return false;
    }
    std::size_t slot = objects_[object].firstReference;
    for (const auto& [key, value] : dictionary) {
        std::uint64_t keyNumber = 0;
        std::uint64_t valueNumber = 0;
        if (!addText(key, keyNumber) || !add(value, depth + 1, valueNumber)) {
            return false;
        }
        references_[slot] = keyNumber;
        references_[slot + dictionary.size()] = valueNumber;
        ++slot;
    }
    return true;
}

bool PropertyListWriter::enterContainer(std::size_t references, std::size_t depth,
                                        std::size_t object) {
    if (depth >= limits_.depth) {
        return fail("nested too deeply");
    }
    if (references > objectsLeft_) {
        return fail("too many objects");
    }
    objectsLeft_ -= references;
    objects_[object].firstReference = references_.size();
    objects_[object].referenceCount = references;
    references_.resize(references_.size() + references);
    return true;
}

bool PropertyListWriter::payForBytes(std::size_t count) {
    if (count > bytesLeft_) {
        return fail("too much text and data");
    }
    bytesLeft_ -= count;
    return true;
}

void PropertyListWriter::writeObject(const Object& object) {
    if (object.text != nullptr) {
        return writeText(*object.text);
    }
    const PropertyList& list = *object.list;
    if (const auto* boolean = list.as<bool>()) {
        bytes_.push_back(*boolean ? propertylist::trueByte : propertylist::falseByte);
    } else if (const auto* integer = list.as<std::int64_t>()) {
        writeInteger(*integer);
    } else if (const auto* natural = list.as<std::uint64_t>()) {
        writeUnsigned(*natural);
    } else if (const auto* real = list.as<double>()) {
        bytes_.push_back(propertylist::realByte);
        writeBigEndian(std::bit_cast<std::uint64_t>(*real), 8);
    } else if (const auto* date = list.as<Date>()) {
        writeDate(*date);
    } else if (const auto* data = list.as<Data>()) {
        writeHead(firstByte(Kind::data, 0), data->size());
        bytes_.insert(bytes_.end(), data->bytes().begin(), data->bytes().end());
    } else if (list.as<PropertyListArray>() != nullptr) {
        writeHead(firstByte(Kind::array, 0), object.referenceCount);
        writeReferences(object);
    } else {
        writeHead(firstByte(Kind::dictionary, 0), object.referenceCount / 2);
        writeReferences(object);
    }
}

void PropertyListWriter::writeText(const std::string& text) {
    if (isAscii(text)) {
        writeHead(firstByte(Kind::asciiString, 0), text.size());
        bytes_.insert(bytes_.end(), text.begin(), text.end());
        return;
    }
    writeHead(firstByte(Kind::utf16String, 0), utf16Length(text).value_or(0));
    std::string_view rest = text;
    while (!rest.empty()) {
        const char32_t codePoint = takeCodePoint(rest).value_or(U'\uFFFD');
        if (utf16UnitCount(codePoint) == 1) {
            writeBigEndian(codePoint, 2);
        } else {
            const char32_t offset = codePoint - 0x10000;
            writeBigEndian(0xD800 + (offset >> 10), 2);
            writeBigEndian(0xDC00 + (offset & 0x3FF), 2);
        }
    }
}

// The format knows a sign in the forms of eight and sixteen bytes only.
void PropertyListWriter::writeInteger(std::int64_t number) {
    const std::size_t size = number < 0 ? 8 : sizeFor(static_cast<std::uint64_t>(number));
    bytes_.push_back(firstByte(Kind::integer, static_cast<std::size_t>(std::countr_zero(size))));
    writeBigEndian(static_cast<std::uint64_t>(number), size);
}

void PropertyListWriter::writeUnsigned(std::uint64_t number) {
    if (number <= std::uint64_t{std::numeric_limits<std::int64_t>::max()}) {
        return writeInteger(static_cast<std::int64_t>(number));
    }
    bytes_.push_back(firstByte(Kind::integer, 4));
    writeBigEndian(0, 8);
    writeBigEndian(number, 8);
}

void PropertyListWriter::writeDate(const Date& date) {
    const double sinceOrigin = static_cast<double>(date.seconds - propertylist::dateOrigin) +
                               static_cast<double>(date.nanoseconds) * 1e-9;
    bytes_.push_back(propertylist::dateByte);
    writeBigEndian(std::bit_cast<std::uint64_t>(sinceOrigin), 8);
}

void PropertyListWriter::writeHead(std::uint8_t kind, std::size_t count) {
    if (count < propertylist::countFollows) {
        bytes_.push_back(static_cast<std::uint8_t>(kind | count));
        return;
    }
    bytes_.push_back(kind | propertylist::countFollows);
    writeInteger(static_cast<std::int64_t>(count));
}

void PropertyListWriter::writeReferences(const Object& object) {
    for (std::size_t i = 0; i < object.referenceCount; ++i) {
        writeBigEndian(references_[object.firstReference + i], referenceSize_);
    }
}

void PropertyListWriter::writeTable(const std::vector<std::size_t>& offsets) {
    const std::size_t tableBegin = bytes_.size();
    const std::size_t offsetSize = sizeFor(tableBegin);
    for (const std::size_t offset : offsets) {
        writeBigEndian(offset, offsetSize);
    }
    writeBigEndian(0, 6);
    writeBigEndian(offsetSize, 1);
    writeBigEndian(referenceSize_, 1);
    writeBigEndian(offsets.size(), 8);
    writeBigEndian(0, 8);  // the top object is the first
    writeBigEndian(tableBegin, 8);
}

void PropertyListWriter::writeBigEndian(std::uint64_t number, std::size_t size) {
    for (std::size_t i = size; i > 0; --i) {
        bytes_.push_back(static_cast<std::uint8_t>(i > 8 ? 0 : number >> (8 * (i - 1))));
    }
}

}  // namespace marrowdale
