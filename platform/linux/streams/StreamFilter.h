#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/store/EventBatch.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// Which events of a history are a stream's, and what they look like there. Says so from names
// alone. May be used by any thread once it is made.
class StreamFilter {
  public:
    // A stream by path, or relative to a device, as in FileEventStreamRequest, over the history of
    // the tree below `rootPath` on the volume `rootDevice`.
    StreamFilter(const std::vector<std::string>& paths, std::optional<DeviceID> device,
                 std::string rootPath, DeviceID rootDevice);

    // Whether the history tells of everything that the stream asks for.
    [[nodiscard]] bool isRecorded() const { return recorded_; }
    // The event as the stream hands it out; no value when it is not the stream's.
    [[nodiscard]] std::optional<FileEvent> take(const StoredEvent& event) const;

  private:
    void addFolder(std::string path);
    void addFeed(std::string_view path);
    [[nodiscard]] bool isBelowOne(std::string_view path) const;

    const std::string rootPath_;
    std::vector<std::string> folders_;  // below the root; empty: the root itself
    bool takesMoves_ = false;           // the feed of moved documents
    bool recorded_ = true;
};

}  // namespace marrowdale::native
