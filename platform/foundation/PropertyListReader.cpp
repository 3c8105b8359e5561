#include "platform/foundation/PropertyListReader.h"

#include <algorithm>
#include <bit>
#include <cerrno>
#include <cmath>
#include <limits>
#include <string_view>
#include <utility>

#include "platform/foundation/PropertyListFormat.h"
#include "platform/foundation/Utf8.h"

namespace marrowdale {

using propertylist::Kind;

namespace {

constexpr bool isSurrogate(std::uint64_t unit) {
    return unit >= 0xD800 && unit <= 0xDFFF;
}
constexpr bool isHighSurrogate(std::uint64_t unit) {
    return unit >= 0xD800 && unit <= 0xDBFF;
}
constexpr bool isLowSurrogate(std::uint64_t unit) {
    return unit >= 0xDC00 && unit <= 0xDFFF;
}

constexpr Kind kindOf(std::uint8_t first) {
    return static_cast<Kind>(first >> 4);
}

constexpr bool hasCount(Kind kind) {
    return kind == Kind::data || kind == Kind::asciiString || kind == Kind::utf16String ||
           kind == Kind::array || kind == Kind::dictionary;
}

PropertyList integerList(std::uint64_t bits, bool isSigned) {
    constexpr std::uint64_t greatest = std::numeric_limits<std::int64_t>::max();
    if (isSigned || bits <= greatest) {
        return PropertyList(static_cast<std::int64_t>(bits));
    }
    return PropertyList(bits);
}

}  // namespace

PropertyListReader::PropertyListReader(std::span<const std::uint8_t> bytes,
                                       const PropertyListLimits& limits)
    : bytes_(bytes), limits_(limits), objectsLeft_(limits.objects), bytesLeft_(limits.bytes) {}

Expected<PropertyList> PropertyListReader::read() {
    PropertyList result;
    if (!readTrailer() || !payForObjects(1) || !readObject(topObject_, 0, result) ||
        !checkOverlaps()) {
        return Unexpected(
            errorWithPOSIXCode(EBADMSG, std::string("decode property list: ") + reason_, ""));
    }
    return result;
}

bool PropertyListReader::fail(const char* reason) {
    reason_ = reason;
    return false;
}

bool PropertyListReader::readTrailer() {
    using propertylist::magic;
    using propertylist::trailerSize;
    if (bytes_.size() > limits_.bytes) {
        return fail("too long");
    }
    if (bytes_.size() < magic.size() + trailerSize ||
        !std::ranges::equal(bytes_.first(magic.size()), magic, {}, {},
                            [](char c) { return static_cast<std::uint8_t>(c); })) {
        return fail("no header, or too short");
    }
    // Six bytes that mean nothing here, two sizes, and three numbers of eight bytes.
    const std::size_t trailer = bytes_.size() - trailerSize;
    offsetSize_ = bytes_[trailer + 6];
    referenceSize_ = bytes_[trailer + 7];
    const std::uint64_t objectCount = bigEndian(trailer + 8, 8);
    topObject_ = bigEndian(trailer + 16, 8);
    const std::uint64_t tableBegin = bigEndian(trailer + 24, 8);
    if (offsetSize_ < 1 || offsetSize_ > 8 || referenceSize_ < 1 || referenceSize_ > 8) {
        return fail("bad sizes in the trailer");
    }
    if (objectCount < 1 || objectCount > limits_.objects) {
        return fail("too many objects, or none");
    }
    if (tableBegin < magic.size() || tableBegin > trailer ||
        trailer - tableBegin != objectCount * offsetSize_) {
        return fail("the offset table does not fill its place");
    }
    objectCount_ = static_cast<std::size_t>(objectCount);
    tableBegin_ = static_cast<std::size_t>(tableBegin);
    visits_.resize(objectCount_, Visit::none);
    extents_.reserve(objectCount_);
    return true;
}

bool PropertyListReader::readObject(std::uint64_t number, std::size_t depth, PropertyList& result) {
    const auto offset = offsetOf(number);
    if (!offset) {
        return false;
    }
    Visit& visit = visits_[static_cast<std::size_t>(number)];
    if (visit == Visit::open) {
        return fail("an object contains itself");
    }
    const bool isFirstVisit = visit == Visit::none;
    visit = Visit::open;
    Head head{};
    Extent extent{*offset, *offset};
    if (!readHead(*offset, head) || !readBody(head, depth, result, extent)) {
        return false;
    }
    visit = Visit::done;
    if (isFirstVisit) {
        extents_.push_back(extent);
    }
    return true;
}

bool PropertyListReader::readBody(const Head& head, std::size_t depth, PropertyList& result,
                                  Extent& extent) {
    switch (kindOf(head.first)) {
        case Kind::constant:
            if (head.first != propertylist::trueByte && head.first != propertylist::falseByte) {
                return fail("an unknown constant");
            }
            result = PropertyList(head.first == propertylist::trueByte);
            return take(head, 0, extent);
        case Kind::integer:
            return readInteger(head, result, extent);
        case Kind::real:
            return readReal(head, result, extent);
        case Kind::date:
            return readDate(head, result, extent);
        case Kind::data:
            return readData(head, result, extent);
        case Kind::asciiString:
        case Kind::utf16String: {
            std::string text;
            const bool isAsciiKind = kindOf(head.first) == Kind::asciiString;
            if (!(isAsciiKind ? readAscii(head, text, extent) : readUtf16(head, text, extent))) {
                return false;
            }
            result = PropertyList(std::move(text));
            return true;
        }
        case Kind::array:
            return readArray(head, depth, result, extent);
        case Kind::dictionary:
            return readDictionary(head, depth, result, extent);
    }
    return fail("an unknown kind of object");
}

bool PropertyListReader::readHead(std::size_t offset, Head& head) {
    head = {bytes_[offset], 0, offset + 1};
    if (!hasCount(kindOf(head.first))) {
        return true;
    }
    head.count = head.first & 0x0F;
    if (head.count != propertylist::countFollows) {
        return true;
    }
    // The count is an integer object of one, two, four or eight bytes.
    if (head.begin >= tableBegin_) {
        return fail("a count past the end");
    }
    const std::uint8_t first = bytes_[head.begin];
    const std::size_t size = std::size_t{1} << (first & 0x0F & 0x03);
    if (kindOf(first) != Kind::integer || (first & 0x0F) > 3 ||
        tableBegin_ - head.begin - 1 < size) {
        return fail("a bad count");
    }
    const std::uint64_t count = bigEndian(head.begin + 1, size);
    head.begin += 1 + size;
    // Every counted thing takes a byte at least, so multiples of the count can't overflow below.
    if (count > tableBegin_ - head.begin) {
        return fail("a count past the end");
    }
    head.count = static_cast<std::size_t>(count);
    return true;
}

bool PropertyListReader::readInteger(const Head& head, PropertyList& result, Extent& extent) {
    const unsigned power = head.first & 0x0F;
    if (power > 4) {
        return fail("an integer of a bad size");
    }
    const std::size_t size = std::size_t{1} << power;
    if (!take(head, size, extent)) {
        return false;
    }
    if (size <= 8) {
        result = integerList(bigEndian(head.begin, size), size == 8);
        return true;
    }
    const std::uint64_t high = bigEndian(head.begin, 8);
    const std::uint64_t low = bigEndian(head.begin + 8, 8);
    const bool isNegative = high == std::numeric_limits<std::uint64_t>::max() && (low >> 63) != 0;
    if (high != 0 && !isNegative) {
        return fail("an integer of more than 64 bits");
    }
    result = integerList(low, isNegative);
    return true;
}

bool PropertyListReader::readReal(const Head& head, PropertyList& result, Extent& extent) {
    if (head.first == propertylist::realByte) {
        if (!take(head, 8, extent)) {
            return false;
        }
        result = PropertyList(std::bit_cast<double>(bigEndian(head.begin, 8)));
        return true;
    }
    if (head.first != propertylist::floatByte) {
        return fail("a real of a bad size");
    }
    if (!take(head, 4, extent)) {
        return false;
    }
    const auto bits = static_cast<std::uint32_t>(bigEndian(head.begin, 4));
    result = PropertyList(double{std::bit_cast<float>(bits)});
    return true;
}

bool PropertyListReader::readDate(const Head& head, PropertyList& result, Extent& extent) {
    if (head.first != propertylist::dateByte) {
        return fail("a date of a bad size");
    }
    if (!take(head, 8, extent)) {
        return false;
    }
    const auto sinceOrigin = std::bit_cast<double>(bigEndian(head.begin, 8));
    constexpr auto range = static_cast<double>(propertylist::dateRange);
    if (std::isnan(sinceOrigin) || sinceOrigin < -range || sinceOrigin > range) {
        return fail("a date out of range");
    }
    const double whole = std::floor(sinceOrigin);
    const auto nanoseconds = static_cast<std::uint32_t>(std::lround((sinceOrigin - whole) * 1e9));
    const std::int64_t seconds = static_cast<std::int64_t>(whole) + propertylist::dateOrigin;
    const std::uint32_t carry = nanoseconds / 1'000'000'000;
    result = PropertyList(Date{seconds + carry, nanoseconds - carry * 1'000'000'000});
    return true;
}

bool PropertyListReader::readData(const Head& head, PropertyList& result, Extent& extent) {
    if (!take(head, head.count, extent) || !payForBytes(head.count)) {
        return false;
    }
    const auto content = bytes_.subspan(head.begin, head.count);
    result = PropertyList(Data(Bytes(content.begin(), content.end())));
    return true;
}

bool PropertyListReader::readAscii(const Head& head, std::string& result, Extent& extent) {
    if (!take(head, head.count, extent) || !payForBytes(head.count)) {
        return false;
    }
    const auto content = bytes_.subspan(head.begin, head.count);
    result.assign(content.begin(), content.end());
    return isAscii(result) || fail("a string that is not ASCII");
}

bool PropertyListReader::readUtf16(const Head& head, std::string& result, Extent& extent) {
    if (!take(head, 2 * head.count, extent) || !payForBytes(2 * head.count)) {
        return false;
    }
    result.reserve(head.count);
    for (std::size_t i = 0; i < head.count; ++i) {
        const std::uint64_t unit = bigEndian(head.begin + 2 * i, 2);
        if (!isSurrogate(unit)) {
            appendCodePoint(result, static_cast<char32_t>(unit));
            continue;
        }
        ++i;
        const std::uint64_t next = i < head.count ? bigEndian(head.begin + 2 * i, 2) : 0;
        if (!isHighSurrogate(unit) || !isLowSurrogate(next)) {
            return fail("a string that is not UTF-16");
        }
        appendCodePoint(result,
                        static_cast<char32_t>(0x10000 + ((unit & 0x3FF) << 10) + (next & 0x3FF)));
    }
    return true;
}

bool PropertyListReader::readArray(const Head& head, std::size_t depth, PropertyList& result,
                                   Extent& extent) {
    if (!enterContainer(head, head.count, depth, extent)) {
        return false;
    }
    PropertyListArray elements(head.count);
    for (std::size_t i = 0; i < head.count; ++i) {
        if (!readObject(reference(head, i), depth + 1, elements[i])) {
            return false;
        }
    }
    result = PropertyList(std::move(elements));
    return true;
}

bool PropertyListReader::readDictionary(const Head& head, std::size_t depth, PropertyList& result,
                                        Extent& extent) {
    if (!enterContainer(head, 2 * head.count, depth, extent)) {
        return false;
    }
    PropertyListDictionary entries;
    for (std::size_t i = 0; i < head.count; ++i) {
        std::string key;
        if (!readKey(reference(head, i), key)) {
            return false;
        }
        const auto [entry, isNew] = entries.try_emplace(std::move(key));
        if (!isNew) {
            return fail("a key twice in one dictionary");
        }
        if (!readObject(reference(head, head.count + i), depth + 1, entry->second)) {
            return false;
        }
    }
    result = PropertyList(std::move(entries));
    return true;
}

bool PropertyListReader::readKey(std::uint64_t number, std::string& result) {
    const auto offset = offsetOf(number);
    if (!offset) {
        return false;
    }
    Head head{};
    Extent extent{*offset, *offset};
    if (!readHead(*offset, head)) {
        return false;
    }
    const Kind kind = kindOf(head.first);
    if (kind != Kind::asciiString && kind != Kind::utf16String) {
        return fail("a key that is no string");
    }
    if (!(kind == Kind::asciiString ? readAscii(head, result, extent)
                                    : readUtf16(head, result, extent))) {
        return false;
    }
    Visit& visit = visits_[static_cast<std::size_t>(number)];
    if (visit == Visit::none) {
        visit = Visit::done;
        extents_.push_back(extent);
    }
    return true;
}

bool PropertyListReader::checkOverlaps() {
    std::ranges::sort(extents_, {}, &Extent::begin);
    const auto overlap = std::ranges::adjacent_find(
        extents_, [](const Extent& a, const Extent& b) { return a.end > b.begin; });
    return overlap == extents_.end() || fail("objects that overlap");
}

std::optional<std::size_t> PropertyListReader::offsetOf(std::uint64_t number) {
    if (number >= objectCount_) {
        fail("a reference to no object");
        return std::nullopt;
    }
    const std::uint64_t offset =
        bigEndian(tableBegin_ + static_cast<std::size_t>(number) * offsetSize_, offsetSize_);
    if (offset < propertylist::magic.size() || offset >= tableBegin_) {
        fail("an offset out of range");
        return std::nullopt;
    }
    return static_cast<std::size_t>(offset);
}

bool PropertyListReader::take(const Head& head, std::size_t size, Extent& extent) {
    if (size > tableBegin_ - head.begin) {
        return fail("an object past the end");
    }
    extent.end = head.begin + size;
    return true;
}

bool PropertyListReader::payForObjects(std::size_t count) {
    if (count > objectsLeft_) {
        return fail("too many objects");
    }
    objectsLeft_ -= count;
    return true;
}

bool PropertyListReader::payForBytes(std::size_t count) {
    if (count > bytesLeft_) {
        return fail("too much text and data");
    }
    bytesLeft_ -= count;
    return true;
}

bool PropertyListReader::enterContainer(const Head& head, std::size_t references, std::size_t depth,
                                        Extent& extent) {
    if (depth >= limits_.depth) {
        return fail("nested too deeply");
    }
    return take(head, references * referenceSize_, extent) && payForObjects(references);
}

std::uint64_t PropertyListReader::bigEndian(std::size_t offset, std::size_t size) const {
    if (size == 1) {
        return bytes_[offset];
    }
    std::uint64_t number = 0;
    for (const std::uint8_t byte : bytes_.subspan(offset, size)) {
        number = (number << 8) | byte;
    }
    return number;
}

std::uint64_t PropertyListReader::reference(const Head& head, std::size_t index) const {
    return bigEndian(head.begin + index * referenceSize_, referenceSize_);
}

}  // namespace marrowdale
