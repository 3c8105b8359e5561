#include "providers/marrowdale/items/FileSystemAccess.h"

#include <array>
#include <cerrno>
#include <utility>

namespace marrowdale {

namespace {

// What the listing that made the URL learnt of the key; null when it was not asked.
const PrefetchedValues* learnt(const URL& url, ResourceKey key) {
    const PrefetchedValues* values = url.prefetched();
    return values && values->known.contains(key) ? values : nullptr;
}

// The key's value; monostate, after a line in the log, when it can't be read.
ResourceValue resource(const Platform& platform, const URL& url, ResourceKey key) {
    auto value = platform.fileSystem.resourceValue(url, key);
    if (!value) {
        platform.log.error("can't get resource \"" + std::string(name(key)) + "\" for " +
                           url.absoluteString() + "; " + value.error().description());
        return {};
    }
    return std::move(*value);
}

template <typename T>
std::optional<T> resourceOfType(const Platform& platform, const URL& url, ResourceKey key) {
    ResourceValue value = resource(platform, url, key);
    T* typed = std::get_if<T>(&value);
    return typed ? std::optional<T>(std::move(*typed)) : std::nullopt;
}

// Whether a read failed because there is nothing to read: the attribute does not exist, or the
// file system keeps none.
bool isAttributeNotFound(const Error& error) {
    return error.domain == ErrorDomain::posix && (error.code == ENODATA || error.code == ENOTSUP);
}

bool quietBoolean(const Platform& platform, const URL& url, ResourceKey key) {
    const auto value = platform.fileSystem.resourceValue(url, key);
    const bool* boolean = value ? std::get_if<bool>(&*value) : nullptr;
    return boolean && *boolean;
}

}  // namespace

std::optional<std::string> resourceString(const Platform& platform, const URL& url,
                                          ResourceKey key) {
    if (const auto* values = learnt(url, key); values && !values->absent.contains(key)) {
        if (key == ResourceKey::typeIdentifier) {
            return std::string(values->typeIdentifier);
        }
        if (key == ResourceKey::name) {
            return std::string(url.lastPathComponent());
        }
    }
    return resourceOfType<std::string>(platform, url, key);
}

std::optional<Number> resourceNumber(const Platform& platform, const URL& url, ResourceKey key) {
    if (const auto* values = learnt(url, key)) {
        if (values->absent.contains(key)) {
            return std::nullopt;
        }
        if (key == ResourceKey::fileSize) {
            return Number(values->fileSize);
        }
    }
    return resourceOfType<Number>(platform, url, key);
}

std::optional<Date> resourceDate(const Platform& platform, const URL& url, ResourceKey key) {
    if (const auto* values = learnt(url, key)) {
        if (values->absent.contains(key)) {
            return std::nullopt;
        }
        if (key == ResourceKey::contentModificationDate) {
            return values->contentModificationDate;
        }
        if (key == ResourceKey::creationDate) {
            return values->creationDate;
        }
    }
    return resourceOfType<Date>(platform, url, key);
}

std::optional<bool> resourceBoolean(const Platform& platform, const URL& url, ResourceKey key) {
    if (const auto* values = learnt(url, key);
        values && key == ResourceKey::isWritable && !values->absent.contains(key)) {
        return values->isWritable;
    }
    return resourceOfType<bool>(platform, url, key);
}

std::optional<Data> resourceData(const Platform& platform, const URL& url, ResourceKey key) {
    if (const auto* values = learnt(url, key);
        values && key == ResourceKey::contentModificationDate && !values->absent.contains(key)) {
        return dataWithDate(values->contentModificationDate);
    }
    const ResourceValue value = resource(platform, url, key);
    if (const auto* date = std::get_if<Date>(&value)) {
        return dataWithDate(*date);
    }
    const auto* data = std::get_if<Data>(&value);
    return data ? std::optional(*data) : std::nullopt;
}

Data dataWithDate(const Date& date) {
    constexpr std::size_t secondsSize = 8;
    constexpr std::size_t nanosecondsSize = 4;
    std::array<std::uint8_t, secondsSize + nanosecondsSize> bytes{};
    const auto seconds = static_cast<std::uint64_t>(date.seconds);
    for (std::size_t i = 0; i < secondsSize; ++i) {
        bytes[i] = static_cast<std::uint8_t>(seconds >> (8 * (secondsSize - 1 - i)));
    }
    for (std::size_t i = 0; i < nanosecondsSize; ++i) {
        bytes[secondsSize + i] =
            static_cast<std::uint8_t>(date.nanoseconds >> (8 * (nanosecondsSize - 1 - i)));
    }
    return Data::copyOf(bytes);
}

std::optional<std::uint64_t> unsignedValue(const Number& number) {
    if (const auto* value = std::get_if<std::uint64_t>(&number)) {
        return *value;
    }
    const auto* value = std::get_if<std::int64_t>(&number);
    return value && *value >= 0 ? std::optional(static_cast<std::uint64_t>(*value)) : std::nullopt;
}

bool hx_isFolder(const Platform& platform, const URL& url) {
    const auto* directory = learnt(url, ResourceKey::isDirectory);
    const auto* package = learnt(url, ResourceKey::isPackage);
    if (directory && package) {
        return directory->isDirectory && !package->isPackage;
    }
    return quietBoolean(platform, url, ResourceKey::isDirectory) &&
           !quietBoolean(platform, url, ResourceKey::isPackage);
}

std::optional<Data> initWithValueOfXattr(const Platform& platform, std::string_view name,
                                         const URL& url) {
    const auto size = platform.extendedAttributes.size(url, name);
    if (!size) {
        if (!isAttributeNotFound(size.error())) {
            platform.log.error("can't get xattr " + std::string(name) + "; " +
                               size.error().description());
        }
        return std::nullopt;
    }
    auto value = platform.extendedAttributes.read(url, name, *size);
    if (!value) {
        platform.log.error("can't copy data for xattr " + std::string(name) + "; " +
                           value.error().description());
        return std::nullopt;
    }
    return std::move(*value);
}

int setXattr(const Platform& platform, const OpenFile& file, std::string_view name,
             const Data& value) {
    const auto set = platform.extendedAttributes.set(file, name, value);
    if (set) {
        return 0;
    }
    platform.log.error("can't set xattr \"" + std::string(name) + "\"; " +
                       set.error().description());
    return set.error().code;
}

int removeXattr(const Platform& platform, const OpenFile& file, std::string_view name) {
    const auto removed = platform.extendedAttributes.remove(file, name);
    if (removed || removed.error() == errorWithPOSIXCode(ENODATA)) {
        return 0;
    }
    platform.log.error("can't remove xattr \"" + std::string(name) + "\"; " +
                       removed.error().description());
    return removed.error().code;
}

namespace detail {

std::optional<ArchivedObject> unarchivedRoot(const Data& data) {
    auto root = unarchive(data.bytes());
    return root ? std::optional(std::move(*root)) : std::nullopt;
}

void logUnexpectedClass(const Platform& platform, std::string_view className,
                        std::string_view source) {
    platform.log.error("got " + std::string(className) + " while unarchiving object from " +
                       std::string(source));
}

}  // namespace detail

}  // namespace marrowdale
