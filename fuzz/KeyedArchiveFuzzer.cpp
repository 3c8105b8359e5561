// Whatever the bytes are, unarchiving ends; and an object that came out is archived and unarchived
// again as the same. Objects are compared by their archives, see PropertyListFuzzer.

#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/KeyedArchive.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const auto object = marrowdale::unarchive(std::span(bytes, size));
    if (!object) {
        return 0;
    }
    const auto archived = marrowdale::archive(*object);
    if (!archived) {
        marrowdale::fatalError("an object that was unarchived can't be archived");
    }
    const auto again = marrowdale::unarchive(archived->bytes());
    if (!again || marrowdale::archive(*again).value() != *archived) {
        marrowdale::fatalError("an object that was archived is unarchived as another");
    }
    return 0;
}
