#pragma once

#include <concepts>
#include <cstdint>
#include <functional>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/ResourceValue.h"

namespace marrowdale {

// An object that a keyed archive can hold. A keyed archive is a binary property list whose root
// dictionary has three entries: "version" (1), "class" (the class of the root object, below) and
// "value". Inside arrays and dictionaries each element is again such a pair of "class" and "value",
// so classes survive at every depth. See docs/formats/keyed-archive.md.
class ArchivedObject;
using ArchivedArray = std::vector<ArchivedObject>;
using ArchivedDictionary = std::map<std::string, ArchivedObject, std::less<>>;

// An application's bundle record, archived as its bundle identifier alone.
struct ArchivedBundleRecord {
    std::string bundleIdentifier;
    friend bool operator==(const ArchivedBundleRecord&, const ArchivedBundleRecord&) = default;
};

class ArchivedObject {
  public:
    using Value = std::variant<Date, Number, std::string, Data, ArchivedArray, ArchivedDictionary,
                               ArchivedBundleRecord>;
    // From anything that a Value is made of.
    template <typename T>
        requires(!std::same_as<std::remove_cvref_t<T>, ArchivedObject> &&
                 std::constructible_from<Value, T &&>)
    ArchivedObject(T&& value)  // NOLINT(google-explicit-constructor)
        : value_(std::forward<T>(value)) {}
    // Not inline: GCC 12 takes the variant's inlined destruction for a use of unset members.
    ArchivedObject(const ArchivedObject& other);
    ArchivedObject(ArchivedObject&& other) noexcept;
    ArchivedObject& operator=(const ArchivedObject& other);
    ArchivedObject& operator=(ArchivedObject&& other) noexcept;
    ~ArchivedObject();

    [[nodiscard]] const Value& value() const { return value_; }
    template <typename T>
    [[nodiscard]] const T* as() const {
        return std::get_if<T>(&value_);
    }
    // "OrbDate", "OrbNumber", "OrbString", "OrbData", "OrbArray", "OrbDictionary",
    // "OrbBundleRecord": what log lines name.
    [[nodiscard]] std::string_view className() const;
    friend bool operator==(const ArchivedObject&, const ArchivedObject&) = default;

  private:
    Value value_;
};

// Dates keep their nanoseconds, numbers their width's sign, strings their bytes even where these
// are not UTF-8 (a string may be a path); equal objects give equal bytes. Fails (POSIX EINVAL) for
// a date whose nanoseconds are not below 10^9, a dictionary's key that is not UTF-8, and an object
// past the property list's limits; each array or dictionary takes two levels of their depth.
[[nodiscard]] Expected<Data> archive(const ArchivedObject& object);
// Fails (POSIX EBADMSG) for anything that is not a whole archive of a known version and classes.
// As hardened as decodePropertyList.
[[nodiscard]] Expected<ArchivedObject> unarchive(std::span<const std::uint8_t> bytes);

}  // namespace marrowdale
