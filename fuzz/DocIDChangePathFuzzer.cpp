// Whatever the bytes of an event's path are, reading them ends; and what was read, written out in
// the path's form, is read again as the same.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "platform/foundation/FatalError.h"
#include "providers/marrowdale/fs/DocIDChangePath.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const std::string path(bytes, bytes + size);
    marrowdale::DocIDChange change;
    if (!marrowdale::parseDocIDChangePath(path, change)) {
        if (change != marrowdale::DocIDChange{}) {
            marrowdale::fatalError("a refused path left something behind");
        }
        return 0;
    }
    const std::string written = "/.docid/1/changed/" + std::to_string(change.documentID) +
                                "/src=" + std::to_string(change.sourceFileID) +
                                ",dst=" + std::to_string(change.destinationFileID);
    marrowdale::DocIDChange again;
    if (!marrowdale::parseDocIDChangePath(written, again) || again != change) {
        marrowdale::fatalError("a path that was written is read as another");
    }
    return 0;
}
