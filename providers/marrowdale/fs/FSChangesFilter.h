#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

// What of the changes in its trees concerns one container: to the working set everything, to all
// directories the folders, to a folder (the root among them) what lies directly in it. App
// libraries concern none; the root's own enumerator reports them.

// Why an update is not told to the container, as the end of a line in the log; empty: it is told.
[[nodiscard]] std::string reasonToIgnoreUpdate(std::string_view container, const LocalItem& item);

enum class DeletionRoute : std::uint8_t {
    forwarded,
    ignoredAsLibrary,
    ignoredAsNoDirectory,
    leftToTheRoot,  // the root's own enumerator has to look which libraries there are
};
// Of a deletion nothing but the identifier is known; it is told where it may concern.
[[nodiscard]] DeletionRoute routeOfDeletion(std::string_view container,
                                            std::string_view identifier);

}  // namespace marrowdale
