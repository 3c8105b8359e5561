#include "platform/linux/files/AttributeReader.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <functional>
#include <utility>

#include "platform/linux/files/AttributeNames.h"

namespace marrowdale::native {

namespace {

// The kernel sets as many bytes aside as a call offers, so the first offer is small.
constexpr std::size_t listRoom = 1024;
constexpr std::size_t valueRoom = 1024;
constexpr std::size_t largestList = 65536;
constexpr int growthTries = 8;

constexpr std::string_view accessListName = "system.posix_acl_access";
constexpr std::string_view networkAccessListName = "system.nfs4_acl";

bool namesNothing(const std::string& name) {
    return name.empty() || name.find('\0') != std::string::npos;
}

}  // namespace

Expected<Data> readWholeValue(const AttributeCalls::InFolder& folder, const char* name,
                              const char* systemName) {
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): the kernel fills it, once an item
    std::array<std::uint8_t, valueRoom> room;
    ssize_t size = folder.get(name, systemName, room);
    if (size >= 0) {
        return Data::copyOf(std::span(room).first(static_cast<std::size_t>(size)));
    }
    int code = errno;
    for (int tries = 0; code == ERANGE && tries < growthTries; ++tries) {
        size = folder.get(name, systemName, {});
        if (size >= 0) {
            // One byte more, because an empty buffer would ask for the size.
            Bytes bytes(static_cast<std::size_t>(size) + 1);
            size = folder.get(name, systemName, bytes);
            if (size >= 0) {
                bytes.resize(static_cast<std::size_t>(size));
                return Data(std::move(bytes));
            }
        }
        code = errno;
    }
    return Unexpected(errorWithPOSIXCode(code, "read an attribute of", name));
}

AttributeReader::AttributeReader(std::vector<std::string> names)
    : names_(std::make_shared<const std::vector<std::string>>(std::move(names))),
      fingerprint_(names_->size()) {
    for (const std::string& name : *names_) {
        systemNames_.push_back(namesNothing(name) ? std::string() : systemAttributeName(name));
        fingerprint_ = fingerprint_ * 0x100000001B3U + std::hash<std::string>()(name);
    }
    if (!names_->empty()) {
        emptySet_ =
            std::make_shared<const AttributeSet>(names_, std::vector<AttributeSet::Entry>());
    }
}

AttributeReader::Answer AttributeReader::read(const AttributeCalls::InFolder& folder,
                                              const char* name) const {
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): the kernel fills it, once an item
    std::array<char, listRoom> room;
    ssize_t size = folder.list(name, room);
    if (size >= 0) {
        return readListed(folder, name, std::span(room).first(static_cast<std::size_t>(size)));
    }
    if (errno == ERANGE) {
        std::vector<char> large(largestList);
        size = folder.list(name, large);
        if (size >= 0) {
            return readListed(folder, name, std::span(large).first(static_cast<std::size_t>(size)));
        }
    }
    const int code = errno;
    return code == EOPNOTSUPP ? Answer() : failed(code);
}

AttributeReader::Answer AttributeReader::readListed(const AttributeCalls::InFolder& folder,
                                                    const char* name,
                                                    std::span<const char> listed) const {
    Answer answer;
    std::vector<AttributeSet::Entry> entries;
    std::string_view rest(listed.data(), listed.size());
    while (!rest.empty()) {
        const std::string_view attribute = rest.substr(0, std::min(rest.find('\0'), rest.size()));
        rest.remove_prefix(std::min(attribute.size() + 1, rest.size()));
        if (attribute == accessListName || attribute == networkAccessListName) {
            answer.found.hasAccessList = true;
        } else if (attribute.starts_with(attributePrefix)) {
            const auto asked = std::ranges::find(systemNames_, attribute);
            if (asked != systemNames_.end()) {
                const auto index = static_cast<std::size_t>(asked - systemNames_.begin());
                AttributeSet::Entry entry = readValue(folder, name, index);
                if (entry.error != ENODATA) {
                    entries.reserve(names_->size());
                    answer.complete = answer.complete && entry.error == 0;
                    entries.push_back(std::move(entry));
                }
            }
        }
    }
    if (!entries.empty()) {
        answer.found.set = std::make_shared<const AttributeSet>(names_, std::move(entries));
    }
    return answer;
}

AttributeSet::Entry AttributeReader::readValue(const AttributeCalls::InFolder& folder,
                                               const char* name, std::size_t index) const {
    auto value = readWholeValue(folder, name, systemNames_[index].c_str());
    return value ? AttributeSet::Entry{index, std::move(*value), 0}
                 : AttributeSet::Entry{index, Data(), value.error().code};
}

AttributeReader::Answer AttributeReader::failed(int error) const {
    std::vector<AttributeSet::Entry> entries;
    for (std::size_t index = 0; index < names_->size(); ++index) {
        entries.push_back({index, Data(), error});
    }
    Answer answer{{}, false};
    if (!entries.empty()) {
        answer.found.set = std::make_shared<const AttributeSet>(names_, std::move(entries));
    }
    return answer;
}

}  // namespace marrowdale::native
