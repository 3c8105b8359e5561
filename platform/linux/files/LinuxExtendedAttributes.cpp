#include "platform/linux/files/LinuxExtendedAttributes.h"

#include <cerrno>
#include <optional>
#include <sys/xattr.h>
#include <utility>

#include "platform/linux/files/AttributeNames.h"
#include "platform/linux/files/Place.h"

namespace marrowdale::native {

namespace {

// What a listing learnt: no value where it was not asked for that name.
std::optional<Expected<Data>> listedValue(const URL& url, std::string_view name) {
    const PrefetchedValues* known = url.prefetched();
    if (known == nullptr || !known->attributes || !known->attributes->covers(name)) {
        return std::nullopt;
    }
    auto value = known->attributes->value(name);
    if (!value) {
        return Expected<Data>(Unexpected(value.error()));
    }
    if (!*value) {
        return Expected<Data>(
            Unexpected(errorWithPOSIXCode(ENODATA, "read an attribute of", url.path())));
    }
    return Expected<Data>(std::move(**value));
}

bool isNoName(std::string_view name) {
    return name.empty() || name.find('\0') != std::string_view::npos;
}

}  // namespace

Expected<std::size_t> LinuxExtendedAttributes::size(const URL& url, std::string_view name) {
    if (const auto listed = listedValue(url, name)) {
        return *listed ? Expected<std::size_t>((*listed)->size()) : Unexpected(listed->error());
    }
    return get(url, name, {});
}

Expected<Data> LinuxExtendedAttributes::read(const URL& url, std::string_view name,
                                             std::size_t room) {
    if (auto listed = listedValue(url, name)) {
        if (*listed && (*listed)->size() > room) {
            return Unexpected(errorWithPOSIXCode(ERANGE, "read an attribute of", url.path()));
        }
        return std::move(*listed);
    }
    // One byte more, because an empty buffer would ask for the size.
    Bytes bytes(room + 1);
    const auto size = get(url, name, bytes);
    if (!size) {
        return Unexpected(size.error());
    }
    if (*size > room) {
        return Unexpected(errorWithPOSIXCode(ERANGE, "read an attribute of", url.path()));
    }
    bytes.resize(*size);
    return Data(std::move(bytes));
}

Expected<void> LinuxExtendedAttributes::set(const OpenFile& file, std::string_view name,
                                            const Data& value) {
    if (isNoName(name)) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "set an attribute of", file.url().path()));
    }
    const auto bytes = value.bytes();
    if (::fsetxattr(file.descriptor(), systemAttributeName(name).c_str(), bytes.data(),
                    bytes.size(), 0) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "set an attribute of", file.url().path()));
    }
    return {};
}

Expected<void> LinuxExtendedAttributes::remove(const OpenFile& file, std::string_view name) {
    if (isNoName(name)) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "remove an attribute of", file.url().path()));
    }
    if (::fremovexattr(file.descriptor(), systemAttributeName(name).c_str()) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "remove an attribute of", file.url().path()));
    }
    return {};
}

Expected<std::size_t> LinuxExtendedAttributes::get(const URL& url, std::string_view name,
                                                   std::span<std::uint8_t> buffer) {
    if (isNoName(name)) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "read an attribute of", url.path()));
    }
    const auto place = Place::of(url, trees_);
    if (!place) {
        return Unexpected(place.error());
    }
    if (const auto status = place->isServed() ? place->look() : EntryStatus(); !status) {
        return Unexpected(status.error());
    }
    ssize_t size = -1;
    int code = 0;
    calls_.inFolder(place->directory(), [&](const AttributeCalls::InFolder& folder) {
        size = folder.get(place->name(), systemAttributeName(name).c_str(), buffer);
        code = errno;
    });
    if (size < 0) {
        return Unexpected(errorWithPOSIXCode(code, "read an attribute of", url.path()));
    }
    return static_cast<std::size_t>(size);
}

}  // namespace marrowdale::native
