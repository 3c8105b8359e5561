#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// Which events of a history are a stream's, and what they look like there. Says so from names
// alone. May be used by any thread once it is made.
class StreamFilter {
  public:
    // A stream by path, or relative to a device, as in FileEventStreamRequest, over the history of
    // these trees on the volume `rootDevice`.
    StreamFilter(const std::vector<std::string>& paths, std::optional<DeviceID> device,
                 std::vector<EventRoot> roots, DeviceID rootDevice);

    // Whether the history tells of everything that the stream asks for.
    [[nodiscard]] bool isRecorded() const { return recorded_; }
    // The event as the stream hands it out; no value when it is not the stream's.
    [[nodiscard]] std::optional<FileEvent> take(const StoredEvent& event) const;

  private:
    void addFolder(std::string path);
    [[nodiscard]] const EventRoot* rootOf(std::string_view path) const;
    void addFeed(std::string_view path);
    [[nodiscard]] bool isBelowOne(std::string_view path) const;

    std::vector<EventRoot> roots_;      // their paths without a "/" at the end
    std::vector<std::string> folders_;  // as the paths of events are
    bool takesMoves_ = false;           // the feed of moved documents
    bool recorded_ = true;
};

}  // namespace marrowdale::native
