#include "providers/marrowdale/items/PutBack.h"

#include <algorithm>
#include <vector>

#include "providers/marrowdale/items/AppLibraryOfURL.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemMetadata.h"

namespace marrowdale {

namespace {

std::string sourceText(const URL& url) {
    return std::string(trashPutBackAttribute) + " of \"" + url.path() + "\"";
}

// A path that names something below the folder it is appended to.
bool leadsDown(std::string_view path) {
    if (path.empty() || path.find('\0') != std::string_view::npos) {
        return false;
    }
    for (std::size_t begin = 0; begin <= path.size();) {
        const std::size_t end = std::min(path.find('/', begin), path.size());
        const auto component = path.substr(begin, end - begin);
        if (component.empty() || component == "." || component == "..") {
            return false;
        }
        begin = end + 1;
    }
    return true;
}

}  // namespace

std::optional<std::string> putBackString(const URL& item, const URL& base) {
    const auto components = item.pathComponents();
    const auto baseComponents = base.pathComponents();
    if (baseComponents.empty() || components.size() < baseComponents.size() ||
        !std::equal(baseComponents.begin(), baseComponents.end(), components.begin())) {
        return std::nullopt;
    }
    std::string path;
    for (auto i = baseComponents.size(); i < components.size(); ++i) {
        path.append(path.empty() ? "" : "/").append(components[i]);
    }
    return path;
}

std::optional<URL> readPutBackURL(const Platform& platform, const URL& url) {
    const auto data = initWithValueOfXattr(platform, trashPutBackAttribute, url);
    if (!data) {
        return std::nullopt;
    }
    const auto path = unarchivedObject<std::string>(platform, *data, sourceText(url));
    if (!path || !leadsDown(*path)) {
        return std::nullopt;
    }
    const auto library = appLibraryItemHolding(platform, url);
    return library ? std::optional(
                         library->fileURL.appendingPathComponent(*path).deletingLastPathComponent())
                   : std::nullopt;
}

}  // namespace marrowdale
