#pragma once

#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::host {

// An error of a request as it is told to people and programs.
struct ErrorDescription {
    std::string domain;
    int code = 0;
    std::string name;     // the kind, for machines: "noSuchItem", "posix", …
    std::string message;  // one line for people; may hold any bytes
    // What the kind brings along: "itemIdentifier", "parameter" and "value".
    std::vector<std::pair<std::string, std::string>> details;
    FileProviderItemPtr item = nullptr;  // the one in the way of filenameCollision
};

[[nodiscard]] ErrorDescription described(const Error& error);

}  // namespace marrowdale::host
