#pragma once

#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// What stands at the places of a batch's events: those that are known beforehand are looked at
// together, when the batch has come, so no look is older than the event it is for; what changes
// after it has an event of its own. Lives no longer than the batch. One thread.
class FSEventLooks {
  public:
    // Looks at all of these.
    FSEventLooks(const Platform& platform, const std::vector<URL>& places);

    // What stands at a place: the entry itself, where it is a link too.
    struct Entry {
        URL url;  // to make the item of
        bool exists = false;
        std::optional<FileID> fileID;  // unless it can't be told
    };
    // Looks now, where the place is none of those.
    [[nodiscard]] Entry entryAt(const URL& place) const;

  private:
    const Platform& platform_;
    std::unordered_map<std::string, Expected<URL>> looks_;  // by path
};

}  // namespace marrowdale
