// Whatever the bytes of a frame's records are, reading them ends within them; and each event that
// is read, written out again, is read as the same.

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "platform/foundation/FatalError.h"
#include "platform/linux/store/Record.h"

namespace {

using namespace marrowdale::native;

bool isSame(const StoredEvent& a, const StoredEvent& b) {
    return a.flags == b.flags && a.fileID == b.fileID && a.goneDocument == b.goneDocument;
}

// `before` becomes the event's path.
void check(const Record& record, std::string& before) {
    const std::string last = before;
    before.resize(record.shared);
    before.append(record.event.path);
    StoredEvent event = record.event;
    event.path = before;
    ByteWriter out;
    putEvent(out, event, last);
    RecordReader reader(out.bytes());
    const auto again = reader.next();
    if (!again || again->type != Record::Type::event || !isSame(again->event, event) ||
        again->shared > last.size() ||
        last.substr(0, again->shared) + std::string(again->event.path) != before) {
        marrowdale::fatalError("an event that was written is read as another");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    RecordReader reader(std::as_bytes(std::span(bytes, size)));
    std::string path;
    while (const auto record = reader.next()) {
        if (record->type == Record::Type::event) {
            if (record->shared > path.size()) {
                return 0;  // damage
            }
            check(*record, path);
        }
    }
    return 0;
}
