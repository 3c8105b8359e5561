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

}  // namespace marrowdale
