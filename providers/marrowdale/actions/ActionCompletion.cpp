#include "providers/marrowdale/actions/ActionCompletion.h"

#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ItemLookup.h"

namespace marrowdale {

Error hostError(const Platform& platform, const Error& error) {
    const auto inTheWay = collidingURLOf(error);
    if (!inTheWay) {
        return error;
    }
    auto item = itemAtURL(platform, *inTheWay);
    return item ? collisionErrorForItem(std::move(*item)) : error;
}

Expected<FileProviderItemPtr> freshItemAt(const Platform& platform, const URL& url) {
    auto item = itemAtURL(platform, url);
    return item ? Expected<FileProviderItemPtr>(std::move(*item)) : Unexpected(item.error());
}

Expected<FileProviderItemPtr> hostAnswer(const Platform& platform, const Expected<URL>& answer) {
    return answer ? freshItemAt(platform, *answer)
                  : Unexpected(hostError(platform, answer.error()));
}

}  // namespace marrowdale
