#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// One event of the history, as the store keeps it.
struct StoredEvent {
    EventID id{};
    std::uint32_t flags = 0;    // FileEventFlag, of those that tell of an item
    FileID fileID{};            // 0: none
    DocumentID goneDocument{};  // gone from the volume with this event; 0: none
    // Below the root, without a "/" in front; empty: the root itself. In a library "/KEY" and what
    // follows. With
    // FileEventFlag::documentMoved it is that feed's whole path instead.
    std::string_view path;
};

// The events of one commit, in order, packed as they will be written. One thread.
class EventBatch {
  public:
    // `event.id` does not count: events get their identifiers when they are committed.
    void add(const StoredEvent& event);
    [[nodiscard]] bool empty() const { return count_ == 0; }
    [[nodiscard]] std::size_t count() const { return count_; }
    void clear();

    // Calls `take` with each event, without its identifier, in order.
    template <typename Take>
    void forEach(Take&& take) const {
        std::size_t at = 0;
        while (at < bytes_.size()) {
            take(eventAt(at));
        }
    }

  private:
    // The event at the offset, which moves behind it.
    [[nodiscard]] StoredEvent eventAt(std::size_t& at) const;

    std::vector<std::byte> bytes_;
    std::size_t count_ = 0;
};

}  // namespace marrowdale::native
