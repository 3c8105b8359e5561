#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/ResourceValue.h"
#include "platform/linux/files/Access.h"
#include "platform/linux/files/AttributeReader.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/FileSources.h"

namespace marrowdale::native {

// An entry that is being looked at, and what was found of it so far.
struct LookedEntry {
    std::string_view name;             // what it is called
    const char* systemName = nullptr;  // how it is found in its folder; mostly `name` itself
    EntryStatus status;
    PrefetchedValues values;
    int error = 0;         // errno of a failed look
    bool looked = false;   // `status` and `values` are filled in, or `error` is
    bool dropped = false;  // can't be looked at, or is not served
    bool unread = false;   // its attributes have still to be read
};

// Finds out of the entries of an open folder what their URLs are to bring along, with the fewest
// calls: one statx relative to the folder, one listing of attribute names where the attributes are
// not remembered, one read for each that is there; access is computed. The document identifiers are
// the caller's matter, who knows how many can be asked for at once.
//
// Immutable, so several threads may look at the same time, each in a folder of its own. Must not
// outlive the sources.
class EntryLooks {
  public:
    EntryLooks(ResourceKeySet keys, std::vector<std::string> attributeNames, bool prefetchesStatus,
               const FileSources& sources);

    struct Folder {
        int descriptor = -1;
        Mount mount = Mount::writable;
        // What lies on another device, or is a mount or a private folder, is dropped. None: nothing
        // is, for the folder lies in no served tree.
        std::optional<DeviceID> device;
    };
    // The first step, which says what it is.
    void look(LookedEntry& entry, const Folder& folder) const;

    enum class Threads : std::uint8_t { one, shared };
    // All steps for all of these; the first is left out where it was done. `start` was taken before
    // any of the looks. With shared threads the helper of the sources takes a part, if it is free.
    void finish(std::span<LookedEntry* const> entries, const Folder& folder, Date start,
                Threads threads) const;

  private:
    void describe(LookedEntry& entry, const Folder& folder) const;
    [[nodiscard]] bool findAttributes(LookedEntry& entry, const Folder& folder) const;
    void readAttributes(LookedEntry& entry, const Folder& folder,
                        const AttributeCalls::InFolder& calls, Date start) const;
    void setAttributes(LookedEntry& entry, const Folder& folder,
                       const FoundAttributes& found) const;

    const FileSources& sources_;
    ResourceKeySet keys_;
    bool prefetchesStatus_;
    bool wantsAccess_;
    AttributeReader attributes_;
};

}  // namespace marrowdale::native
