#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/FakeFileEventService.h"
#include "platform/testing/PlatformVariants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "providers/marrowdale/fs/FSEventReader.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {

// Notes each call as a line, and does what a test wants done within it.
class RecordingDelegate : public FSEventReaderDelegate {
  public:
    std::vector<std::string> told;  // on the queue; a test looks behind a drain
    std::vector<std::shared_ptr<LocalItem>> items;
    std::function<void(const std::string& line)> within;

    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                    const FileEvent& event) override {
        items.push_back(item);
        note("change " + item->filename + " " + std::to_string(raw(event.id)));
    }
    void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                    const FileEvent& event) override {
        note("delete " + identifier + " " + path + " " + std::to_string(raw(event.id)));
    }
    void fsEventReaderDidFinishHistory(EventID eventID) override {
        note("history " + std::to_string(raw(eventID)));
    }
    void fsEventReaderMustReset() override { note("reset"); }

  private:
    void note(std::string line) {
        told.push_back(line);
        if (within) {
            within(line);
        }
    }
};

// Real files and items, and streams that tell what a test says.
class FSEventReaderTestWorld : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    using Lines = std::vector<std::string>;

    FSEventReader::Options options(FSEventReaderMode mode = FSEventReaderMode::pathBased) {
        return {.urls = {world_.manager.documentStorageURL()},
                .mode = mode,
                .lastProcessedFSEventID = EventID{10},
                .verbose = true,
                .delegate = delegate_};
    }
    void startReader(FSEventReader::Options options) {
        reader_ = FSEventReader::make(platform_, std::move(options));
        reader_->start();
    }
    void startReader(FSEventReaderMode mode = FSEventReaderMode::pathBased) {
        startReader(options(mode));
    }
    void TearDown() override {
        if (reader_) {
            reader_->stop();
        }
    }
    // The stream that was made last.
    std::shared_ptr<FakeFileEventStream> stream() { return events_.streams().back(); }
    void tell(std::vector<FileEvent> events) { stream()->tell(std::move(events)); }

    // An event of the file with that path below the storage root. Identifiers count up from 11.
    FileEvent event(std::string_view name, std::uint32_t flags,
                    std::optional<FileID> fileID = std::nullopt) {
        return {.id = nextID(),
                .flags = flags,
                .path = world_.path(name),
                .fileID = fileID,
                .goneDocument = {}};
    }
    FileEvent gone(std::string_view name, FileID fileID, std::uint32_t document = 0) {
        FileEvent made = event(name, FileEventFlag::gone, fileID);
        made.goneDocument = DocumentID{document};
        return made;
    }
    FileEvent streamEvent(std::uint32_t flags) {
        return {.id = nextID(), .flags = flags, .path = {}, .fileID = {}, .goneDocument = {}};
    }
    EventID nextID() { return EventID{nextID_++}; }
    // The number of the entry itself, as the real file system has it.
    FileID fileIDOf(std::string_view name) {
        const auto value =
            world_.realFileSystem.resourceValue(world_.url(name), ResourceKey::fileID);
        return FileID{std::get<std::uint64_t>(std::get<Number>(value.value()))};
    }
    [[nodiscard]] std::size_t logged(const std::string& line) const {
        return world_.sink->count(line);
    }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
    FakeFileEventService events_;
    const Platform platform_ = withFileEvents(world_.platform, events_);
    std::shared_ptr<RecordingDelegate> delegate_ = std::make_shared<RecordingDelegate>();
    std::shared_ptr<FSEventReader> reader_;

  private:
    std::uint64_t nextID_ = 11;
};

}  // namespace marrowdale
