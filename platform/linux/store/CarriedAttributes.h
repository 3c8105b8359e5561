#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/files/AttributeCalls.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// Extended attributes that belong to a document rather than to the file it is in at the moment:
// the system's names and the values, in the order in which the file system lists them.
using CarriedAttributes = std::vector<std::pair<std::string, std::string>>;

// Reads and writes them. Any thread.
class AttributeCarrier {
  public:
    // Those whose names, without the system's prefix, begin so; none when it is empty.
    explicit AttributeCarrier(const std::string& prefix);

    // Those of an entry in the open folder; no value when they can't be read, or are more than
    // 256 KiB in all. A file system that keeps no attributes has none.
    [[nodiscard]] std::optional<CarriedAttributes> read(int folder, const char* name);

    enum class Outcome : std::uint8_t {
        written,
        notNeeded,  // it has some of its own, or is another file by now
        refused,    // for now: permissions, room
    };
    // Gives them to the file at `path` below the open folder `root`, where it still is the one that
    // was looked at and has none.
    [[nodiscard]] Outcome write(int root, const std::string& path, FileID file,
                                const CarriedAttributes& attributes);

  private:
    const std::string systemPrefix_;  // empty: nothing is carried
    AttributeCalls calls_;
};

}  // namespace marrowdale::native
