#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/foundation/Data.h"

namespace marrowdale::host {

// The extension's lists of app libraries, below the folder where it keeps its files.
inline constexpr const char* mainLibraryListName = "Marrowdale/app-libraries.plist";
inline constexpr const char* workingSetLibraryListName =
    "Marrowdale/searchable-app-libraries.plist";

// What a host must see of such a list.
struct LibraryList {
    std::uint64_t version = 0;             // 0: there is none that can be read
    std::vector<std::string> identifiers;  // of the applications, sorted
};

[[nodiscard]] LibraryList libraryListIn(const Data& file);

}  // namespace marrowdale::host
