// Whatever the target of a request is, taking it apart ends.

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "host/daemon/ApiMessages.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(bytes), size);
    if (const auto request = marrowdale::host::ApiRequest::fromTarget("GET", text)) {
        [[maybe_unused]] const auto value = request->parameter("page");
    }
    return 0;
}
