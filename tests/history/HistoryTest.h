#pragma once

#include <array>
#include <cstddef>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <ostream>
#include <random>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/fs/FSEventReader.h"
#include "tests/history/Picture.h"
#include "tests/history/RandomWriter.h"

namespace marrowdale::tests {

// How many times as long as usual the tests take.
inline int stress() {
    const char* value = std::getenv("MARROWDALE_STRESS");  // NOLINT(concurrency-mt-unsafe)
    const long times = value != nullptr ? std::strtol(value, nullptr, 10) : 1;
    return times > 0 && times <= 1000 ? static_cast<int>(times) : 1;
}

// A new one each time, or that of MARROWDALE_SEED; printed, so that a failure can be had again.
inline std::uint32_t newSeed() {
    const char* value = std::getenv("MARROWDALE_SEED");  // NOLINT(concurrency-mt-unsafe)
    const std::uint32_t seed = value != nullptr
                                   ? static_cast<std::uint32_t>(std::strtoul(value, nullptr, 10))
                                   : std::random_device()();
    std::cout << "seed " << seed << "\n";
    return seed;
}

// How a store comes to know what happened.
enum class Following : std::uint8_t {
    fanotify,
    inotify,
    restart,  // it is closed while things happen
};

inline constexpr std::array byListening{Following::fanotify, Following::inotify};
inline constexpr std::array everyWay{Following::fanotify, Following::inotify, Following::restart};

using HistoryParameter = std::tuple<TestFileSystem, Following>;

// Each file system with each of these ways.
template <std::size_t count>
auto followedBy(const std::array<Following, count>& ways) {
    return testing::Combine(testing::ValuesIn(testFileSystems()), testing::ValuesIn(ways));
}

inline std::string historyParameterName(const testing::TestParamInfo<HistoryParameter>& info) {
    static constexpr std::array names{"fanotify", "inotify", "restart"};
    return std::get<0>(info.param).name + "_" +
           names.at(static_cast<std::size_t>(std::get<1>(info.param)));
}

// A world that is opened and closed, and a client who follows it.
class HistoryTest : public testing::TestWithParam<HistoryParameter> {
  public:
    HistoryTest() = default;
    ~HistoryTest() override { close(); }
    HistoryTest(const HistoryTest&) = delete;
    HistoryTest& operator=(const HistoryTest&) = delete;

  protected:
    [[nodiscard]] Following following() const { return std::get<1>(GetParam()); }
    [[nodiscard]] bool isLive() const { return following() != Following::restart; }
    [[nodiscard]] virtual native::StoreOptions options() const {
        native::StoreOptions options;
        if (isLive()) {
            options.recording = native::StoreOptions::Recording::live;
            options.watcher = following() == Following::fanotify ? native::Watcher::Kind::fanotify
                                                                 : native::Watcher::Kind::inotify;
        }
        return options;
    }
    [[nodiscard]] const TemporaryDirectory& directory() const { return directory_; }
    [[nodiscard]] std::string root() const { return directory_.path("Documents"); }
    [[nodiscard]] std::string path(const std::string& below) const { return root() + "/" + below; }
    [[nodiscard]] TestWorld& world() { return *world_; }
    [[nodiscard]] bool isOpen() const { return world_ != nullptr; }
    [[nodiscard]] native::Store& store() { return *world_->store; }
    [[nodiscard]] Picture& picture() { return *picture_; }

    void open() {
        world_ = std::make_unique<TestWorld>(directory_, options());
        picture_->setWorld(world_.get());
        const auto recorder = store().report().recorder;
        ASSERT_TRUE(recorder.watcher || !isLive()) << recorder.problem;
    }
    void close() {
        stopReader();
        picture_->setWorld(nullptr);
        world_.reset();
    }
    // The client enumerates everything; what comes after it is news. The anchor comes first.
    void begin() {
        open();
        since_ = *store().barrier();
        first_ = since_;
        picture_->fill();
    }
    void startReader() {
        reader_ = FSEventReader::make(
            world_->platform,
            {.urls = {world_->manager.documentStorageURL()},
             .lastProcessedFSEventID = since_,
             .delegate = std::static_pointer_cast<FSEventReaderDelegate>(picture_)});
        reader_->start();
    }
    void stopReader() {
        if (reader_) {
            reader_->stop();
            reader_->streamQueue().sync([] {});
            since_ = reader_->lastProcessedFSEventID();
            reader_.reset();
        }
    }
    // Everything that is recorded is told to the client.
    void catchUp() {
        stopReader();
        const std::size_t before = picture_->historiesDone();
        startReader();
        ASSERT_TRUE(waitUntil([&] { return picture_->historiesDone() > before; }));
        stopReader();
    }
    // A reader that runs has told everything that happened so far.
    void waitForReader() {
        ASSERT_TRUE(store().barrier());
        const std::string last = path("last" + std::to_string(++lasts_));
        writeFile(last, "x");
        ASSERT_TRUE(waitUntil([&] { return picture_->knowsPath(last); }));
    }
    void expectWhole() {
        auto differences = picture_->differences();
        if (differences.size() > 10) {
            differences.resize(10);
        }
        for (const std::string& difference : differences) {
            ADD_FAILURE() << difference;
        }
        EXPECT_EQ(picture_->resets(), 0U);
        if (!differences.empty()) {
            printHistory();
        }
    }
    // The whole history, where a failed test asks for it with MARROWDALE_HISTORY=1.
    void printHistory() {
        if (std::getenv("MARROWDALE_HISTORY") == nullptr) {  // NOLINT(concurrency-mt-unsafe)
            return;
        }
        const auto cursor = store().eventsSince(first_);
        ASSERT_TRUE(cursor) << cursor.error().description();
        for (auto event = (*cursor)->next(); event && *event; event = (*cursor)->next()) {
            std::cout << raw((*event)->id) << " " << std::hex << ((*event)->flags >> 16U)
                      << std::dec << " " << (*event)->path << " fid=" << raw((*event)->fileID)
                      << " did=" << raw((*event)->goneDocument) << "\n";
        }
    }
    [[nodiscard]] EventID since() const { return since_; }
    void setSince(EventID since) { since_ = since; }
    [[nodiscard]] FSEventReader& reader() { return *reader_; }

  private:
    TemporaryDirectory directory_{std::get<0>(GetParam()).dir};
    std::unique_ptr<TestWorld> world_;
    std::shared_ptr<Picture> picture_ = std::make_shared<Picture>();
    std::shared_ptr<FSEventReader> reader_;
    EventID since_{};
    EventID first_{};
    int lasts_ = 0;
};

}  // namespace marrowdale::tests
