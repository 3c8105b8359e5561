#pragma once

#include <expected>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "platform/foundation/KeyedArchive.h"

// How the provider talks to the file system: reads of resource values by type, extended attributes,
// archived values with a check of their class. Every failure is logged here, once, and answered as
// no value or as an error number, so that callers decide whether it is fatal to their request.
// Everything may be called from any thread.

namespace marrowdale {

// One resource of a file URL, converted to the type asked for. No value when the resource has none,
// when it is of another type, and, after the line "can't get resource "KEY" for URL; ERROR", when
// it can't be read. What a listing learnt is answered without asking the system.
[[nodiscard]] std::optional<std::string> resourceString(const Platform& platform, const URL& url,
                                                        ResourceKey key);
[[nodiscard]] std::optional<Number> resourceNumber(const Platform& platform, const URL& url,
                                                   ResourceKey key);
[[nodiscard]] std::optional<Date> resourceDate(const Platform& platform, const URL& url,
                                               ResourceKey key);
[[nodiscard]] std::optional<bool> resourceBoolean(const Platform& platform, const URL& url,
                                                  ResourceKey key);
// A date is converted too: see dataWithDate.
[[nodiscard]] std::optional<Data> resourceData(const Platform& platform, const URL& url,
                                               ResourceKey key);

// 12 bytes, big-endian: seconds (64 bits) and nanoseconds (32 bits). Equal for equal dates only.
[[nodiscard]] Data dataWithDate(const Date& date);

// A number of either sign and width as unsigned 64 bits; no value for a fraction, or a number that
// they can't hold.
[[nodiscard]] std::optional<std::uint64_t> unsignedValue(const Number& number);

// A folder that presents as one: a directory that is no package. A link never is one. False, with
// no line in the log, when that can't be found out.
[[nodiscard]] bool hx_isFolder(const Platform& platform, const URL& url);

// The whole value of an attribute of the item itself (a final link is not followed). No value, and
// no line in the log, when the item has no such attribute or lies where there are none at all.
[[nodiscard]] std::optional<Data> initWithValueOfXattr(const Platform& platform,
                                                       std::string_view name, const URL& url);
// Replaces any earlier value. 0, or the system's error number.
[[nodiscard]] int setXattr(const Platform& platform, const OpenFile& file, std::string_view name,
                           const Data& value);
// 0, also when there was none, or the system's error number.
[[nodiscard]] int removeXattr(const Platform& platform, const OpenFile& file,
                              std::string_view name);

enum class UnarchiveError { invalidResultingClass };

namespace detail {

// The archive's root object; none when the bytes are no archive.
[[nodiscard]] std::optional<ArchivedObject> unarchivedRoot(const Data& data);
void logUnexpectedClass(const Platform& platform, std::string_view className,
                        std::string_view source);

}  // namespace detail

// The object that `data` archives. Fails, after the line "got CLASS while unarchiving object from
// SOURCE", when that is of another class; bytes that are no archive are of class "nil".
template <typename Class>
[[nodiscard]] std::expected<Class, UnarchiveError> unarchivedObject(const Platform& platform,
                                                                    const Data& data,
                                                                    std::string_view source) {
    const auto root = detail::unarchivedRoot(data);
    const Class* object = root ? root->template as<Class>() : nullptr;
    if (!object) {
        detail::logUnexpectedClass(platform, root ? root->className() : "nil", source);
        return std::unexpected(UnarchiveError::invalidResultingClass);
    }
    return *object;
}

}  // namespace marrowdale
