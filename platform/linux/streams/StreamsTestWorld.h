#pragma once

#include <algorithm>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "platform/linux/store/JournalTestSupport.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// The history of a real journal in a folder of its own, with a made-up tree around it. Faults are
// asked for by its members, before the threads that meet them are there. Any thread.
class TestHistory final : public EventHistory {
  public:
    static constexpr DeviceID volume{0x801};

    TestHistory() { world_.open(); }

    // Set before a stream is made.
    std::string root = "/served";
    std::vector<EventRoot> libraries;
    std::optional<Error> barrierError;
    std::function<void()> duringBarrier;
    std::function<void()> duringEventsSince;
    bool closed = false;  // nothing may be called any more

    // What happens in the tree.
    void commit(const std::vector<StoredEvent>& events) {
        {
            const std::lock_guard lock(mutex_);
            for (const StoredEvent& event : events) {
                world_.add(std::string(event.path), event.flags, raw(event.fileID),
                           raw(event.goneDocument));
            }
            world_.commit();
        }
        tell(News::committed);
    }
    void appear(const std::string& path) {
        commit({{.flags = FileEventFlag::appeared, .fileID = FileID{7}, .path = path}});
    }
    // "1", "2", and so on, in one commit.
    void appearMany(int count) {
        std::vector<std::string> names;
        std::vector<StoredEvent> events;
        names.reserve(static_cast<std::size_t>(count));
        for (int i = 1; i <= count; ++i) {
            names.push_back(std::to_string(i));
            events.push_back({.flags = FileEventFlag::appeared, .path = names.back()});
        }
        commit(events);
    }
    void tell(News news) {
        const std::lock_guard lock(listenerMutex_);
        for (const auto& [number, listener] : listeners_) {
            listener(news);
        }
    }
    // What only a test that has no other thread at the time may touch.
    [[nodiscard]] TestJournal& world() { return world_; }
    [[nodiscard]] std::size_t listeners() {
        const std::lock_guard lock(listenerMutex_);
        return listeners_.size();
    }

    Expected<EventID> barrier() override {
        EXPECT_FALSE(closed);
        if (duringBarrier) {
            duringBarrier();
        }
        if (barrierError) {
            return Unexpected(*barrierError);
        }
        return lastEventID();
    }
    EventID lastEventID() override {
        EXPECT_FALSE(closed);
        return world_.journal().log()->lastEvent();
    }
    Standing standingOf(EventID since) override { return world_.journal().standingOf(since); }
    Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since) override {
        EXPECT_FALSE(closed);
        if (duringEventsSince) {
            duringEventsSince();
        }
        return world_.journal().eventsSince(since);
    }
    std::vector<EventRoot> roots() override {
        std::vector<EventRoot> all{{{}, root, true}};
        all.insert(all.end(), libraries.begin(), libraries.end());
        return all;
    }
    DeviceID device() override { return volume; }
    Expected<UUID> volumeUUID(const URL& /*url*/) override { return world_.uuid(); }
    std::uint64_t addListener(std::function<void(News)> listener) override {
        const std::lock_guard lock(listenerMutex_);
        listeners_[++lastListener_] = std::move(listener);
        return lastListener_;
    }
    void removeListener(std::uint64_t number) override {
        EXPECT_FALSE(closed);
        const std::lock_guard lock(listenerMutex_);
        listeners_.erase(number);
    }

  private:
    std::mutex mutex_;
    TestJournal world_;
    std::mutex listenerMutex_;
    std::map<std::uint64_t, std::function<void(News)>> listeners_;
    std::uint64_t lastListener_ = 0;
};

// What a stream's callback got.
class Collected {
  public:
    void take(std::span<const FileEvent> batch) {
        const std::lock_guard lock(mutex_);
        EXPECT_FALSE(batch.empty());
        batches_.push_back(batch.size());
        events_.insert(events_.end(), batch.begin(), batch.end());
    }
    [[nodiscard]] std::vector<FileEvent> events() const {
        const std::lock_guard lock(mutex_);
        return events_;
    }
    [[nodiscard]] std::vector<std::size_t> batches() const {
        const std::lock_guard lock(mutex_);
        return batches_;
    }
    [[nodiscard]] std::size_t count() const {
        const std::lock_guard lock(mutex_);
        return events_.size();
    }
    // How many events have all of the flags.
    [[nodiscard]] std::size_t countOf(std::uint32_t flags) const {
        const std::lock_guard lock(mutex_);
        return static_cast<std::size_t>(std::ranges::count_if(
            events_, [flags](const FileEvent& event) { return (event.flags & flags) == flags; }));
    }
    [[nodiscard]] bool isHistoryDone() const { return countOf(FileEventFlag::historyDone) > 0; }
    // The events in words: "5 /served/a", "7 done", "7 dropped", "7 wrapped".
    [[nodiscard]] std::vector<std::string> words() const {
        std::vector<std::string> words;
        for (const FileEvent& event : events()) {
            words.push_back(std::to_string(raw(event.id)) + " " + word(event));
        }
        return words;
    }

  private:
    [[nodiscard]] static std::string word(const FileEvent& event) {
        if (event.path) {
            return *event.path;
        }
        switch (event.flags) {
            case FileEventFlag::historyDone:
                return "done";
            case FileEventFlag::kernelDropped:
                return "dropped";
            case FileEventFlag::userDropped:
                return "too slow";
            case FileEventFlag::eventIDsWrapped:
                return "wrapped";
            default:
                return std::to_string(event.flags);
        }
    }

    mutable std::mutex mutex_;
    std::vector<FileEvent> events_;
    std::vector<std::size_t> batches_;
};

}  // namespace marrowdale::native
