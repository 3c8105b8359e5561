#include "platform/linux/store/CarriedAttributes.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <string_view>
#include <sys/xattr.h>

#include "platform/linux/files/AttributeNames.h"
#include "platform/linux/files/AttributeReader.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

namespace {

constexpr std::size_t mostNames = 65'536;
// Some file systems take any number of them, from anybody.
constexpr std::size_t mostBytes = 256U << 10U;

// The names that the list holds, each with a NUL behind it; no value when they can't be listed.
std::optional<std::string> namesOf(const AttributeCalls::InFolder& folder, const char* name) {
    std::array<char, 1024> few{};
    ssize_t size = folder.list(name, few);
    if (size >= 0) {
        return std::string(few.data(), static_cast<std::size_t>(size));
    }
    if (errno == ENOTSUP) {
        return std::string();
    }
    if (errno != ERANGE) {
        return std::nullopt;
    }
    std::string many(mostNames, '\0');
    size = folder.list(name, many);
    if (size < 0) {
        return std::nullopt;
    }
    many.resize(static_cast<std::size_t>(size));
    return many;
}

}  // namespace

AttributeCarrier::AttributeCarrier(const std::string& prefix)
    : systemPrefix_(prefix.empty() ? std::string() : systemAttributeName(prefix)) {}

std::optional<CarriedAttributes> AttributeCarrier::read(int folder, const char* name) {
    std::optional<CarriedAttributes> found;
    if (systemPrefix_.empty()) {
        return found;
    }
    calls_.inFolder(folder, [&](const AttributeCalls::InFolder& inFolder) {
        const auto names = namesOf(inFolder, name);
        if (!names) {
            return;
        }
        CarriedAttributes attributes;
        std::size_t total = 0;
        for (std::size_t at = 0; at < names->size();) {
            const std::string attribute = names->c_str() + at;
            at += attribute.size() + 1;
            if (!attribute.starts_with(systemPrefix_)) {
                continue;
            }
            const auto value = readWholeValue(inFolder, name, attribute.c_str());
            if (!value) {
                return;
            }
            total += attribute.size() + value->size();
            if (total > mostBytes) {
                return;
            }
            const auto bytes = value->bytes();
            attributes.emplace_back(
                attribute, std::string(reinterpret_cast<const char*>(bytes.data()), bytes.size()));
        }
        found = std::move(attributes);
    });
    return found;
}

AttributeCarrier::Outcome AttributeCarrier::write(int root, const std::string& path, FileID file,
                                                  const CarriedAttributes& attributes) {
    const auto slash = path.rfind('/');
    const auto folder =
        holdFolderBeneath(root, slash == std::string::npos ? std::string() : path.substr(0, slash));
    if (!folder) {
        return Outcome::refused;
    }
    const std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
    const UniqueFD opened(::openat(folder->get(), name.c_str(),
                                   O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    if (!opened) {
        return errno == ENOENT || errno == ELOOP ? Outcome::notNeeded : Outcome::refused;
    }
    const auto status = statEntry(opened.get(), "");
    const auto own = read(folder->get(), name.c_str());
    if (!status || status->fileID != file || !status->isRegular() || (own && !own->empty())) {
        return Outcome::notNeeded;
    }
    for (const auto& [attribute, value] : attributes) {
        if (::fsetxattr(opened.get(), attribute.c_str(), value.data(), value.size(), 0) != 0) {
            return Outcome::refused;
        }
    }
    return Outcome::written;
}

}  // namespace marrowdale::native
