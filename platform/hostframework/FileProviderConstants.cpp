#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale {

const Data& VantrelInitialPageSortedByDate() {
    static const Data page = Data::fromText("VantrelInitialPageSortedByDate");
    return page;
}

const Data& VantrelInitialPageSortedByName() {
    static const Data page = Data::fromText("VantrelInitialPageSortedByName");
    return page;
}

Error errorForNonExistentItem(std::string_view itemIdentifier) {
    return {ErrorDomain::fileProvider,
            static_cast<int>(FileProviderErrorCode::noSuchItem),
            {},
            std::string(itemIdentifier)};
}

Error errorSyncAnchorExpired() {
    return {ErrorDomain::fileProvider,
            static_cast<int>(FileProviderErrorCode::syncAnchorExpired),
            {},
            {}};
}

Error collisionErrorForItem(std::shared_ptr<const FileProviderItem> item) {
    Error error{ErrorDomain::fileProvider,
                static_cast<int>(FileProviderErrorCode::filenameCollision),
                {},
                item->filename};
    error.userInfo = std::make_shared<CollidingItemInfo>(std::move(item));
    return error;
}

Error errorInvalidParameter(std::string_view parameter, std::string_view value) {
    return {ErrorDomain::fileProvider, static_cast<int>(FileProviderErrorCode::invalidParameter),
            std::string(parameter), std::string(value)};
}

}  // namespace marrowdale
