#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/PropertyList.h"

namespace marrowdale {

// Reads one binary property list; made for one `read`. Bounds: recursion by limits.depth, and time
// and memory by limits.objects and limits.bytes, because everything is paid for before it is made,
// shared objects each time that they are met.
class PropertyListReader {
  public:
    // `bytes` must outlive the reader.
    PropertyListReader(std::span<const std::uint8_t> bytes, const PropertyListLimits& limits);

    [[nodiscard]] Expected<PropertyList> read();

  private:
    enum class Visit : std::uint8_t { none, open, done };

    // The bytes of one object, [begin, end) of the whole.
    struct Extent {
        std::size_t begin;
        std::size_t end;
    };

    // An object's first byte and count, taken apart.
    struct Head {
        std::uint8_t first;
        std::size_t count;  // of a string, data, array or dictionary
        std::size_t begin;  // of what follows the head
    };

    // The steps below answer false after noting what is wrong.
    bool fail(const char* reason);
    bool readTrailer();
    bool readObject(std::uint64_t number, std::size_t depth, PropertyList& result);
    bool readBody(const Head& head, std::size_t depth, PropertyList& result, Extent& extent);
    bool readHead(std::size_t offset, Head& head);
    bool readInteger(const Head& head, PropertyList& result, Extent& extent);
    bool readReal(const Head& head, PropertyList& result, Extent& extent);
    bool readDate(const Head& head, PropertyList& result, Extent& extent);
    bool readData(const Head& head, PropertyList& result, Extent& extent);
    bool readAscii(const Head& head, std::string& result, Extent& extent);
    bool readUtf16(const Head& head, std::string& result, Extent& extent);
    bool readArray(const Head& head, std::size_t depth, PropertyList& result, Extent& extent);
    bool readDictionary(const Head& head, std::size_t depth, PropertyList& result, Extent& extent);
    bool readKey(std::uint64_t number, std::string& result);
    bool checkOverlaps();

    // Offset of an object's first byte.
    std::optional<std::size_t> offsetOf(std::uint64_t number);
    // Takes `size` bytes from the object that begins with `head`.
    bool take(const Head& head, std::size_t size, Extent& extent);
    bool payForObjects(std::size_t count);
    bool payForBytes(std::size_t count);
    bool enterContainer(const Head& head, std::size_t references, std::size_t depth,
                        Extent& extent);
    [[nodiscard]] std::uint64_t bigEndian(std::size_t offset, std::size_t size) const;
    // The reference at `index` of the container that begins with `head`.
    [[nodiscard]] std::uint64_t reference(const Head& head, std::size_t index) const;

    std::span<const std::uint8_t> bytes_;
    PropertyListLimits limits_;
    std::size_t objectsLeft_;
    std::size_t bytesLeft_;
    const char* reason_ = "";

    std::size_t offsetSize_ = 0;
    std::size_t referenceSize_ = 0;
    std::size_t objectCount_ = 0;
    std::uint64_t topObject_ = 0;
    std::size_t tableBegin_ = 0;

    std::vector<Visit> visits_;    // of each object
    std::vector<Extent> extents_;  // of each object that was met
};

}  // namespace marrowdale
