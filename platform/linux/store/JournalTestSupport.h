#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/store/Journal.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {

// An event as a test compares it.
struct TestEvent {
    std::uint64_t id = 0;
    std::uint32_t flags = 0;
    std::uint64_t fileID = 0;
    std::uint32_t goneDocument = 0;
    std::string path;
    friend bool operator==(const TestEvent&, const TestEvent&) = default;
    friend void PrintTo(const TestEvent& event, std::ostream* stream) {
        *stream << event.id << " " << std::hex << event.flags << std::dec << " " << event.fileID
                << " " << event.goneDocument << " \"" << event.path << "\"";
    }
};

inline TestEvent testEvent(const StoredEvent& event) {
    return {raw(event.id), event.flags, raw(event.fileID), raw(event.goneDocument),
            std::string(event.path)};
}

// A journal on its own, with an index that has no rows unless the test makes some.
class TestJournal {
  public:
    explicit TestJournal(const std::string& parent = {})
        : directory_(parent), folder_(directory_.path("state"), "0123456789abcdef") {
        makeFolder(directory_.path("state"));
        identity_ = StoreIdentity::fresh({}, directory_.path("state"), "");
        const auto made = folder_.create(identity_);
        EXPECT_TRUE(made) << made.error().description();
        options.clock = [this] { return now; };
    }

    Journal::Options options;
    Date now{1'700'000'000, 0};

    void open() {
        index_ = std::make_unique<Index>();
        auto loaded = tryLoad(*index_);
        ASSERT_TRUE(loaded) << loaded.error().description();
        journal_ = std::move(*loaded);
    }
    [[nodiscard]] Expected<std::unique_ptr<Journal>> tryLoad(Index& index) const {
        return Journal::load(folder_, identity_, "", index, options);
    }
    void close() {
        if (journal_) {
            EXPECT_TRUE(journal_->close());
        }
        crash();
    }
    // Without a clean end.
    void crash() { journal_.reset(); }

    [[nodiscard]] Journal& journal() { return *journal_; }
    [[nodiscard]] Index& index() { return *index_; }
    [[nodiscard]] const StoreFolder& folder() const { return folder_; }
    [[nodiscard]] const UUID& uuid() const { return identity_.uuid; }
    [[nodiscard]] std::string path() const { return directory_.path(); }

    void add(const std::string& path, std::uint32_t flags = 0x1'0000, std::uint64_t fileID = 7,
             std::uint32_t gone = 0) {
        batch_.add({{}, flags, FileID{fileID}, DocumentID{gone}, path});
    }
    // Commits what was added.
    void commit() {
        const auto done = journal_->commit(*index_, batch_, journal_->lastDocument());
        ASSERT_TRUE(done) << done.error().description();
        ASSERT_TRUE(batch_.empty());
    }
    void commitOne(const std::string& path) {
        add(path);
        commit();
    }
    // Commits until a new segment was begun `count` times; each event's path is its identifier.
    void fillSegments(int count) {
        const auto last =
            journal_->log()->segments().back()->header.number + static_cast<std::uint64_t>(count);
        const std::string rest(2000, 'x');
        while (journal_->log()->segments().back()->header.number < last) {
            for (int i = 0; i < 200; ++i) {
                add(std::to_string(++named_) + "/" + rest);
            }
            commit();
        }
    }

    void snapshot() {
        if (index_->endOfRows() <= rootRow) {
            Row values{};
            values.flags = static_cast<std::uint32_t>(RowKind::folder);
            ASSERT_EQ(index_->add(noRow, {}, values), rootRow);
        }
        commit();
        const auto done = journal_->writeSnapshot(*index_);
        ASSERT_TRUE(done) << done.error().description();
    }

    // All events behind `since`; what went wrong is a failure of the test.
    [[nodiscard]] std::vector<TestEvent> eventsSince(std::uint64_t since) const {
        auto cursor = journal_->eventsSince(EventID{since});
        if (!cursor) {
            ADD_FAILURE() << cursor.error().description();
            return {};
        }
        return read(**cursor);
    }
    [[nodiscard]] static std::vector<TestEvent> read(EventCursor& cursor) {
        std::vector<TestEvent> events;
        while (true) {
            const auto event = cursor.next();
            if (!event) {
                ADD_FAILURE() << event.error().description();
                return events;
            }
            if (!*event) {
                return events;
            }
            events.push_back(testEvent(**event));
        }
    }

  private:
    TemporaryDirectory directory_;
    StoreFolder folder_;
    StoreIdentity identity_;
    std::unique_ptr<Index> index_;
    std::unique_ptr<Journal> journal_;
    EventBatch batch_;
    std::uint64_t named_ = 0;
};

}  // namespace marrowdale::native
