#include "providers/marrowdale/fs/FSEventLooks.h"

#include <span>
#include <utility>

#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemLook.h"

namespace marrowdale {

namespace {

bool isMissing(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::noSuchFile);
}

}  // namespace

FSEventLooks::FSEventLooks(const Platform& platform, const std::vector<URL>& places)
    : platform_(platform) {
    auto looks = looksAt(platform, places);
    for (std::size_t i = 0; i < places.size(); ++i) {
        looks_.emplace(places[i].path(), std::move(looks[i]));
    }
}

FSEventLooks::Entry FSEventLooks::entryAt(const URL& place) const {
    const auto known = looks_.find(place.path());
    const auto look = known != looks_.end()
                          ? known->second
                          : std::move(looksAt(platform_, std::span(&place, 1)).front());
    if (!look) {
        return {.url = place, .exists = !isMissing(look.error()), .fileID = {}};
    }
    const auto value = platform_.fileSystem.resourceValue(*look, ResourceKey::fileID);
    if (!value) {
        return {.url = *look, .exists = !isMissing(value.error()), .fileID = {}};
    }
    const auto* number = std::get_if<Number>(&*value);
    const auto fileID = number ? unsignedValue(*number) : std::nullopt;
    return {.url = *look,
            .exists = true,
            .fileID = fileID ? std::optional(FileID{*fileID}) : std::nullopt};
}

}  // namespace marrowdale
