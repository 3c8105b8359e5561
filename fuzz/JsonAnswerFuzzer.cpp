// Whatever somebody sends as an answer, or as a stream of events, reading it ends; what is read as
// an item or an error is written as JSON that is read as the same again.

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "host/client/EventStreamReader.h"
#include "host/requests/ErrorJson.h"
#include "host/requests/FeedJson.h"
#include "platform/foundation/FatalError.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    using namespace marrowdale::host;
    const std::string_view text(reinterpret_cast<const char*>(bytes), size);
    if (const auto item = itemFromJson(text)) {
        const std::string written = itemJson(**item);
        const auto again = itemFromJson(written);
        if (!again || itemJson(**again) != written) {
            marrowdale::fatalError("an item was not read as it was written");
        }
    }
    const std::string error = errorJson(errorFromJson(text));
    if (errorJson(errorFromJson(error)) != error) {
        marrowdale::fatalError("an error was not read as it was written");
    }
    [[maybe_unused]] const auto page = pageFromJson(text);
    [[maybe_unused]] const auto changes = changesFromJson(text);
    [[maybe_unused]] const auto findings = findingsFromJson(text);
    EventStreamReader reader([](std::string_view /*name*/, std::string_view /*data*/) {});
    reader.take(text);
    return 0;
}
