#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"

namespace marrowdale {

class PropertyList;
using PropertyListArray = std::vector<PropertyList>;
// Keys in byte order, so that equal dictionaries have equal bytes.
using PropertyListDictionary = std::map<std::string, PropertyList, std::less<>>;

// A value of the binary property-list format "bplist00". Strings are UTF-8 (ASCII is written as
// such, everything else as UTF-16); integers keep their sign and whole 64-bit range (those above
// 2^63-1 are written in 16 bytes), but not their C++ type: what is read is int64_t where that holds
// it, else uint64_t; a date is written as the format has it, as a floating-point
// number of seconds, and so keeps about a microsecond only: see KeyedArchive for dates without
// loss.
class PropertyList {
  public:
    using Value = std::variant<bool, std::int64_t, std::uint64_t, double, std::string, Data, Date,
                               PropertyListArray, PropertyListDictionary>;

    PropertyList() : value_(false) {}
    // From anything that a Value is made of.
    template <typename T>
        requires(!std::same_as<std::remove_cvref_t<T>, PropertyList> &&
                 std::constructible_from<Value, T &&>)
    PropertyList(T&& value)  // NOLINT(google-explicit-constructor)
        : value_(std::forward<T>(value)) {}
    // Not inline: GCC 12 takes the variant's inlined destruction for a use of unset members.
    PropertyList(const PropertyList& other);
    PropertyList(PropertyList&& other) noexcept;
    PropertyList& operator=(const PropertyList& other);
    PropertyList& operator=(PropertyList&& other) noexcept;
    ~PropertyList();

    [[nodiscard]] const Value& value() const { return value_; }

    // Null when the value is of another class.
    template <typename T>
    [[nodiscard]] const T* as() const {
        return std::get_if<T>(&value_);
    }
    // An integer of either sign that fits uint64_t; no value otherwise.
    [[nodiscard]] std::optional<std::uint64_t> asUnsigned() const;

    friend bool operator==(const PropertyList&, const PropertyList&) = default;

  private:
    Value value_;
};

struct PropertyListLimits {
    std::size_t depth = 64;          // nesting of arrays and dictionaries
    std::size_t objects = 1U << 20;  // objects in the result, keys too, shared ones each time
    std::size_t bytes = 64U << 20;   // the encoded list; and its strings and data, shared ones each
                                     // time
};

// Encodes; equal lists give equal bytes. Fails (POSIX EINVAL, whose operation text says what is
// wrong) for a string that is not UTF-8, a date further than 9.2e18 seconds from 2001, or a list
// past the reader's limits, so that whatever was written can be read back.
[[nodiscard]] Expected<Data> encodePropertyList(const PropertyList& list);

// Decodes. Whatever the bytes are, the call ends soon, with bounded memory (cycles, overlapping
// objects, wrong sizes, offsets out of range, over-deep nesting and over-long lists are refused),
// and with an error (POSIX EBADMSG, whose operation text says what is wrong) or a whole list.
[[nodiscard]] Expected<PropertyList> decodePropertyList(std::span<const std::uint8_t> bytes,
                                                        const PropertyListLimits& limits = {});

}  // namespace marrowdale
