// Whatever the bytes of a read from the kernel are, taking them apart ends and looks at nothing
// beyond them; and each event takes up bytes, so there are no more events than room for them.

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string_view>
#include <sys/fanotify.h>

#include "platform/foundation/FatalError.h"
#include "platform/linux/events/FanotifyMasks.h"
#include "platform/linux/events/FanotifyRecords.h"

namespace {

void checkInside(std::string_view view, std::span<const std::byte> bytes) {
    const auto* begin = reinterpret_cast<const char*>(bytes.data());
    if (!view.empty() &&
        (view.data() < begin || view.data() + view.size() > begin + bytes.size())) {
        marrowdale::fatalError("what was told lies beyond the bytes");
    }
}

void checkRecord(const marrowdale::native::FanotifyRecord& record,
                 std::span<const std::byte> bytes) {
    checkInside(record.thing, bytes);
    for (const auto& place : {record.place, record.from, record.to}) {
        if (place) {
            checkInside(place->folder, bytes);
            checkInside(place->name, bytes);
            if (place->name.find('\0') != std::string_view::npos || place->name == ".") {
                marrowdale::fatalError("a name that no entry of a folder has");
            }
        }
    }
    (void)marrowdale::native::FanotifyMasks::what(record.mask);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* input, std::size_t size) {
    const auto bytes = std::as_bytes(std::span(input, size));
    marrowdale::native::FanotifyRecords records(bytes);
    std::size_t count = 0;
    while (const auto record = records.next()) {
        ++count;
        checkRecord(*record, bytes);
    }
    if (count > size / sizeof(fanotify_event_metadata)) {
        marrowdale::fatalError("more events than bytes for them");
    }
    if (size != 0 && count == 0 && !records.isMalformed()) {
        marrowdale::fatalError("bytes that are neither events nor malformed");
    }
    return 0;
}
