// Whatever the bytes are, reading them ends; and what was read is written and read again as the
// same list. Lists are compared by their encoding, which equal lists share and which, unlike
// equality, takes a real that is no number for itself.

#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/PropertyList.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const auto list = marrowdale::decodePropertyList(std::span(bytes, size));
    if (!list) {
        return 0;
    }
    const auto encoded = marrowdale::encodePropertyList(*list);
    if (!encoded) {
        marrowdale::fatalError("a list that was read can't be written");
    }
    const auto again = marrowdale::decodePropertyList(encoded->bytes());
    if (!again || marrowdale::encodePropertyList(*again).value() != *encoded) {
        marrowdale::fatalError("a list that was written is read as another");
    }
    return 0;
}
