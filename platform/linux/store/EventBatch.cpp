#include "platform/linux/store/EventBatch.h"

#include <cstring>

namespace marrowdale::native {

namespace {

struct Head {
    std::uint64_t fileID;
    std::uint32_t flags;
    std::uint32_t goneDocument;
    std::uint32_t pathSize;
};

}  // namespace

void EventBatch::add(const StoredEvent& event) {
    const Head head{raw(event.fileID), event.flags, raw(event.goneDocument),
                    static_cast<std::uint32_t>(event.path.size())};
    const auto* bytes = reinterpret_cast<const std::byte*>(&head);
    bytes_.insert(bytes_.end(), bytes, bytes + sizeof head);
    const auto* path = reinterpret_cast<const std::byte*>(event.path.data());
    bytes_.insert(bytes_.end(), path, path + event.path.size());
    ++count_;
}

void EventBatch::clear() {
    std::vector<std::byte>().swap(bytes_);
    count_ = 0;
}

StoredEvent EventBatch::eventAt(std::size_t& at) const {
    Head head{};
    std::memcpy(&head, bytes_.data() + at, sizeof head);
    at += sizeof head;
    const std::string_view path(reinterpret_cast<const char*>(bytes_.data()) + at, head.pathSize);
    at += head.pathSize;
    return {.id = {},
            .flags = head.flags,
            .fileID = FileID{head.fileID},
            .goneDocument = DocumentID{head.goneDocument},
            .path = path};
}

}  // namespace marrowdale::native
