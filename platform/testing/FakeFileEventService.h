#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <utility>
#include <vector>

#include "platform/services/FileEventService.h"

namespace marrowdale {

// A stream that was asked for: what it was asked, what was done with it, and a hand to put batches
// on its queue. Any thread.
class FakeFileEventStream {
  public:
    explicit FakeFileEventStream(FileEventStreamRequest request)
        : paths(request.paths),
          device(request.device),
          since(request.since),
          latency(request.latency),
          creationFlags(request.creationFlags),
          queueLabel(request.queue.label()),
          request_(std::move(request)) {}

    const std::vector<std::string> paths;
    const std::optional<DeviceID> device;
    const EventID since;
    const std::chrono::milliseconds latency;
    const std::uint32_t creationFlags;
    const std::string queueLabel;

    // The calls so far, in order: "start", "stop", "invalidate", "release".
    [[nodiscard]] std::vector<std::string> calls() const {
        const std::lock_guard lock(mutex_);
        return calls_;
    }

    // Puts a batch on the queue, between start and stop; nothing otherwise.
    void hand(std::vector<FileEvent> events) {
        const std::lock_guard lock(mutex_);
        if (isRunning_ && request_) {
            request_->queue.async(
                [callback = request_->callback, batch = std::move(events)] { callback(batch); });
        }
    }
    // The same, and waits until the batch was taken. Not on the queue itself.
    void tell(std::vector<FileEvent> events) {
        hand(std::move(events));
        drain();
    }
    // Waits until everything that is on the queue was taken.
    void drain() const {
        std::optional<SerialQueue> queue;
        {
            const std::lock_guard lock(mutex_);
            if (request_) {
                queue = request_->queue;
            }
        }
        if (queue) {
            queue->sync([] {});
        }
    }

    // What the stream's owner does.
    void call(const char* name) {
        std::optional<FileEventStreamRequest> released;  // its captures go without the lock
        const std::lock_guard lock(mutex_);
        calls_.emplace_back(name);
        isRunning_ = calls_.back() == "start";
        if (calls_.back() == "invalidate") {
            std::swap(released, request_);
        }
    }

  private:
    mutable std::mutex mutex_;
    std::optional<FileEventStreamRequest> request_;  // all guarded by mutex_
    std::vector<std::string> calls_;
    bool isRunning_ = false;
};

// Says what it is told to say, and keeps the streams that were asked for. The facts are set before
// the calls; streams may be made on any thread.
class FakeFileEventService : public FileEventService {
  public:
    EventID eventID{1};
    std::optional<Error> eventIDError;
    UUID uuid = *UUID::fromText("C0FFEE00-0000-4000-8000-000000000001");
    std::optional<Error> uuidError;
    // The batches that each stream puts on its queue when it is started.
    std::vector<std::vector<FileEvent>> history;
    bool hasStreams = true;

    // A history in which nothing happened.
    static std::vector<std::vector<FileEvent>> emptyHistory() {
        return {{{.id = EventID{1},
                  .flags = FileEventFlag::historyDone,
                  .path = {},
                  .fileID = {},
                  .goneDocument = {}}}};
    }

    Expected<EventID> currentEventID() override {
        if (eventIDError) {
            return Unexpected(*eventIDError);
        }
        return eventID;
    }
    Expected<UUID> volumeUUID(const URL& /*url*/) override {
        if (uuidError) {
            return Unexpected(*uuidError);
        }
        return uuid;
    }
    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
        if (!hasStreams) {
            return nullptr;
        }
        auto stream = std::make_shared<FakeFileEventStream>(std::move(request));
        const std::lock_guard lock(mutex_);
        streams_.push_back(stream);
        return std::make_unique<Handle>(std::move(stream), history);
    }

    // Those that were made, first one first.
    [[nodiscard]] std::vector<std::shared_ptr<FakeFileEventStream>> streams() const {
        const std::lock_guard lock(mutex_);
        return streams_;
    }

  private:
    class Handle : public FileEventStream {
      public:
        Handle(std::shared_ptr<FakeFileEventStream> stream,
               std::vector<std::vector<FileEvent>> history)
            : stream_(std::move(stream)), history_(std::move(history)) {}
        Handle(const Handle&) = delete;
        Handle& operator=(const Handle&) = delete;
        ~Handle() override { stream_->call("release"); }
        void start() override {
            stream_->call("start");
            for (auto& batch : history_) {
                stream_->hand(std::move(batch));
            }
        }
        void stop() override { stream_->call("stop"); }
        void invalidate() override { stream_->call("invalidate"); }

      private:
        const std::shared_ptr<FakeFileEventStream> stream_;
        std::vector<std::vector<FileEvent>> history_;
    };

    mutable std::mutex mutex_;
    std::vector<std::shared_ptr<FakeFileEventStream>> streams_;  // guarded by mutex_
};

}  // namespace marrowdale
