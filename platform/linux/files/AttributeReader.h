#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/AttributeSet.h"
#include "platform/linux/files/AttributeCache.h"
#include "platform/linux/files/AttributeCalls.h"

namespace marrowdale::native {

// Reads those of a list of attributes that a file has: one call for the names that are there, then
// one for each of them that was asked for. Immutable; one for each list of names.
class AttributeReader {
  public:
    // Names without the system's prefix; a name that is empty or holds a NUL byte names nothing.
    explicit AttributeReader(std::vector<std::string> names);

    struct Answer {
        FoundAttributes found;
        bool complete = true;  // false: something could not be read, so look again next time
    };
    // A file system without such attributes counts as a file without any. Values that can't be read
    // are errors inside the set; when the names can't be listed, every name is.
    [[nodiscard]] Answer read(const AttributeCalls::InFolder& folder, const char* name) const;

    // The set of a file that has none of them; null where no names are asked for.
    [[nodiscard]] const std::shared_ptr<const AttributeSet>& emptySet() const { return emptySet_; }
    // For AttributeCache.
    [[nodiscard]] std::uint64_t fingerprint() const { return fingerprint_; }
    [[nodiscard]] bool asksForNames() const { return !names_->empty(); }

  private:
    [[nodiscard]] AttributeSet::Entry readValue(const AttributeCalls::InFolder& folder,
                                                const char* name, std::size_t index) const;
    [[nodiscard]] Answer readListed(const AttributeCalls::InFolder& folder, const char* name,
                                    std::span<const char> listed) const;
    [[nodiscard]] Answer failed(int error) const;

    AttributeSet::Names names_;
    std::vector<std::string> systemNames_;
    std::shared_ptr<const AttributeSet> emptySet_;
    std::uint64_t fingerprint_ = 0;
};

// Reads a whole value, whatever its size and although it may grow meanwhile; `firstTry` is room for
// most values. The error is an errno value in `Error`.
[[nodiscard]] Expected<Data> readWholeValue(const AttributeCalls::InFolder& folder,
                                            const char* name, const char* systemName);

}  // namespace marrowdale::native
