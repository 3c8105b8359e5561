// Whatever the bytes of a page are, decoding them ends; and a token that was read is written and
// read again as the same token.

#include <cstddef>
#include <cstdint>

#include "platform/foundation/FatalError.h"
#include "providers/marrowdale/fs/FSChangeToken.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const auto token =
        marrowdale::FSChangeToken::decode(marrowdale::Data(marrowdale::Bytes(bytes, bytes + size)));
    if (!token) {
        return 0;
    }
    const auto again = marrowdale::FSChangeToken::decode(token->encode());
    if (size == 48 || !again || *again != *token) {
        marrowdale::fatalError("a token that was written is read as another");
    }
    return 0;
}
