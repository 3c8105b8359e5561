#pragma once

#include <optional>
#include <string_view>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderActions.h"

// The metadata that a host keeps with items, in extended attributes of the files. Each call does
// its work on the caller's thread and has answered when it returns, with the item read afresh.
//
// The three differ on purpose: the last-used date alone refuses app libraries and answers the item
// also when it could not be written; tags are cleared by an empty list, the other two by taking the
// attribute away; a missing item is the framework's error for tags, the look-up's for the others.

namespace marrowdale {

void setLastUsedDate(const Platform& platform, const std::optional<Date>& date,
                     std::string_view itemIdentifier, const ItemCompletionHandler& handler);
void setTagData(const Platform& platform, const std::optional<Data>& tagData,
                std::string_view itemIdentifier, const ItemCompletionHandler& handler);
void setFavoriteRank(const Platform& platform, const std::optional<Number>& rank,
                     std::string_view itemIdentifier, const ItemCompletionHandler& handler);

}  // namespace marrowdale
