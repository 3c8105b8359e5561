#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/foundation/PropertyList.h"

namespace marrowdale {

// Writes one binary property list; made for one `write`. First every object gets its number, in
// the order in which a reader meets them, each distinct string once; then the objects are written,
// as the number of them decides how long a reference is.
class PropertyListWriter {
  public:
    [[nodiscard]] Expected<Data> write(const PropertyList& list);

  private:
    struct Object {
        const PropertyList* list;    // null for a string
        const std::string* text;     // null for everything else
        std::size_t firstReference;  // of a container: index in references_
        std::size_t referenceCount;
    };

    // The steps below answer false after noting what is wrong.
    bool fail(const char* reason);
    bool add(const PropertyList& list, std::size_t depth, std::uint64_t& number);
    bool addText(const std::string& text, std::uint64_t& number);
    bool addArray(const PropertyListArray& array, std::size_t depth, std::size_t object);
    bool addDictionary(const PropertyListDictionary& dictionary, std::size_t depth,
                       std::size_t object);
    bool enterContainer(std::size_t references, std::size_t depth, std::size_t object);
    bool payForBytes(std::size_t count);

    void writeObject(const Object& object);
    void writeText(const std::string& text);
    void writeInteger(std::int64_t number);
    void writeUnsigned(std::uint64_t number);
    void writeDate(const Date& date);
    void writeHead(std::uint8_t kind, std::size_t count);
    void writeReferences(const Object& object);
    void writeTable(const std::vector<std::size_t>& offsets);
    void writeBigEndian(std::uint64_t number, std::size_t size);

    PropertyListLimits limits_;  // the reader's
    std::size_t objectsLeft_ = limits_.objects;
    std::size_t bytesLeft_ = limits_.bytes;
    const char* reason_ = "";

    std::vector<Object> objects_;
    std::vector<std::uint64_t> references_;
    std::unordered_map<std::string_view, std::uint64_t> texts_;  // number of each string
    std::size_t referenceSize_ = 0;
    Bytes bytes_;
};

}  // namespace marrowdale
