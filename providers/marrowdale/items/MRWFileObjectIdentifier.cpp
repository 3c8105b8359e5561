#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <limits>
#include <string_view>

namespace marrowdale {

namespace {

std::string withNumber(std::string_view prefix, std::uint64_t number) {
    std::array<char, 4 + std::numeric_limits<std::uint64_t>::digits10 + 1> text{};
    char* const digits = std::ranges::copy(prefix, text.begin()).out;
    return std::string(text.data(), std::to_chars(digits, text.data() + text.size(), number).ptr);
}

}  // namespace

std::string MRWFileObjectIdentifier::fromFileID(std::uint64_t fileID) {
    return withNumber("fid=", fileID);
}

std::string MRWFileObjectIdentifier::fromDocumentID(std::uint64_t documentID) {
    return withNumber("did=", documentID);
}

std::optional<std::string> MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(
    const Platform& platform, const URL& url) {
    const auto record = platform.applications.proxyFor(url, URLRelationship::same);
    if (!record) {
        platform.log.error("can't find bundle proxy at " + url.absoluteString());
        return std::nullopt;
    }
    return appLibraryIdentifier(*record);
}

std::string appLibraryIdentifier(const BundleRecord& record) {
    return "#" + record.bundleIdentifier().value_or("(null)");
}

}  // namespace marrowdale
