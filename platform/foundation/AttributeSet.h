#pragma once

#include <cstddef>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"

namespace marrowdale {

// The extended attributes of one file that somebody asked to prefetch, as they were at one moment.
// Immutable and shared: the same set is handed out again as long as the file did not change, so
// what a reader derives from it can be kept beside it (see `derived`).
//
// Threads: `value` from any thread; `derived` is internally synchronised.
class AttributeSet {
  public:
    // Without the system's "user." prefix; shared by all sets that answer for the same names.
    using Names = std::shared_ptr<const std::vector<std::string>>;
    struct Entry {
        std::size_t name = 0;  // place in the asked names
        Data value;
        int error = 0;  // errno of a failed read; 0 when `value` holds the value
    };

    // `entries` holds the asked names that the file has (or whose read failed); a name asked for
    // and not in `entries` is an attribute that does not exist.
    AttributeSet(Names askedNames, std::vector<Entry> entries);
    ~AttributeSet();
    AttributeSet(const AttributeSet&) = delete;
    AttributeSet& operator=(const AttributeSet&) = delete;

    // Whether the set can answer for that name at all.
    [[nodiscard]] bool covers(std::string_view name) const;
    // None when the attribute does not exist; an error (POSIX) when it could not be read.
    [[nodiscard]] Expected<std::optional<Data>> value(std::string_view name) const;
    [[nodiscard]] bool empty() const { return entries_.empty(); }
    // Bytes that the set keeps for itself alone, for caches with a bound; what is derived from it
    // is taken to be as large as its values.
    [[nodiscard]] std::size_t memoryUse() const;

    // A slot for one object derived from the set (decoded values); null until somebody stores one.
    // The last one stored wins, earlier readers keep theirs.
    [[nodiscard]] std::shared_ptr<const void> derived() const;
    void setDerived(std::shared_ptr<const void> object) const;

  private:
    Names askedNames_;
    std::vector<Entry> entries_;
    mutable std::mutex derivedMutex_;
    mutable std::shared_ptr<const void> derived_;  // guarded by derivedMutex_
};

}  // namespace marrowdale
