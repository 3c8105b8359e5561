#include "benchmarks/History.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <random>
#include <stdexcept>
#include <sys/stat.h>
#include <system_error>
#include <unordered_set>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "platform/linux/store/Journal.h"
#include "platform/linux/store/StateFolder.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

constexpr std::chrono::minutes patience{1};
constexpr std::uint64_t eventsOfOneCommit = 1000;

template <typename T>
T valueOf(Expected<T> value) {
    if (!value) {
        throw std::runtime_error(value.error().description());
    }
    return std::move(*value);
}

void check(const Expected<void>& done) {
    if (!done) {
        throw std::runtime_error(done.error().description());
    }
}

native::StoreOptions historyOptions(const std::string& root, const std::string& state) {
    native::StoreOptions options;
    options.stateFolder = state;
    options.cacheFolder = state + "/cache";
    options.rootPath = root;
    options.recording = native::StoreOptions::Recording::live;
    options.retention.bytes = std::uint64_t{16} << 30U;
    return options;
}

// 85 bytes, no two neighbours in one folder: what random changes look like.
std::string eventPath(std::uint64_t number) {
    constexpr std::uint64_t folders = 9973;
    return fmt::format(
        "folder number {:05} with a name of nearly middle length/document number {:09}.txt",
        number * 7919 % folders, number % 100'000'000);
}

void writeEvents(const native::StoreFolder& folder, const std::string& cache,
                 std::uint64_t events) {
    const auto identity = valueOf(native::StoreIdentity::read(folder.identity()));
    native::Index index;
    native::Journal::Options options;
    options.retention.bytes = std::uint64_t{16} << 30U;
    const auto journal =
        valueOf(native::Journal::load(folder, identity, cache, index, std::move(options)));
    native::EventBatch batch;
    for (std::uint64_t number = 0; number < events; ++number) {
        const std::string path = eventPath(number);
        batch.add({.id = {},
                   .flags = FileEventFlag::changed,
                   .fileID = FileID{1000 + number},
                   .goneDocument = {},
                   .path = path});
        if (batch.count() == eventsOfOneCommit || number + 1 == events) {
            check(journal->commit(index, batch, journal->lastDocument()));
        }
    }
    check(journal->writeSnapshot(index));
    check(journal->close());
}

}  // namespace

std::unique_ptr<native::Store> openLiveStore(const std::string& root, const std::string& state) {
    auto store = valueOf(native::Store::open(historyOptions(root, state)));
    if (const auto report = store->report().recorder; !report.watcher) {
        throw std::runtime_error("nothing is recorded: " + report.problem);
    }
    return store;
}

EventID recorded(native::Store& store) {
    return valueOf(store.barrier());
}

void touch(const std::string& path) {
    const std::array<timespec, 2> times{{{0, UTIME_OMIT}, {0, UTIME_NOW}}};
    if (::utimensat(AT_FDCWD, path.c_str(), times.data(), 0) != 0) {
        throw std::system_error(errno, std::generic_category(), path);
    }
}

std::vector<std::string> randomFiles(const Tree& tree, std::uint64_t count, std::uint64_t round) {
    std::mt19937_64 generator(round);
    std::uniform_int_distribution<std::uint64_t> any(0, tree.files - 1);
    std::unordered_set<std::uint64_t> taken;
    std::vector<std::string> paths;
    while (paths.size() < std::min(count, tree.files)) {
        if (const std::uint64_t number = any(generator); taken.insert(number).second) {
            paths.push_back(filePath(tree, number));
        }
    }
    return paths;
}

Duration medianDelay(const Tree& tree, std::uint64_t changes,
                     const std::function<void(const std::string& path)>& arrive) {
    std::vector<Duration> delays;
    for (const std::string& path : randomFiles(tree, changes, 1)) {
        delays.push_back(timed([&] {
            touch(path);
            arrive(path);
        }));
    }
    const auto half = delays.begin() + static_cast<std::ptrdiff_t>(delays.size() / 2);
    std::nth_element(delays.begin(), half, delays.end());
    return *half;
}

CountingStream::CountingStream(native::LinuxFileEvents& events, const std::string& root,
                               EventID since) {
    stream_ = events.makeStream(
        {.paths = {root},
         .device = std::nullopt,
         .since = since,
         .latency = std::chrono::milliseconds(0),
         .creationFlags = FileEventCreationFlag::valueTypes | FileEventCreationFlag::fileEvents |
                          FileEventCreationFlag::extendedData,
         .queue = SerialQueue("benchmark"),
         .callback = [this](std::span<const FileEvent> batch) { take(batch); }});
    stream_->start();
}

// What the queue has begun runs to its end before the members go: the last copy of the queue goes
// with the stream.
CountingStream::~CountingStream() {
    stream_->stop();
    stream_->invalidate();
    stream_.reset();
}

void CountingStream::take(std::span<const FileEvent> batch) {
    {
        const std::lock_guard lock(mutex_);
        for (const FileEvent& event : batch) {
            if ((event.flags & FileEventFlag::historyDone) != 0) {
                isHistoryDone_ = true;
            } else {
                ++events_;
            }
        }
    }
    changed_.notify_all();
}

template <typename Condition>
void CountingStream::wait(const Condition& condition) const {
    std::unique_lock lock(mutex_);
    if (!changed_.wait_for(lock, patience, condition)) {
        throw std::runtime_error("no event came");
    }
}

void CountingStream::waitForFirst() {
    wait([this] { return events_ > 0 || isHistoryDone_; });
}
void CountingStream::waitForHistory() {
    wait([this] { return isHistoryDone_; });
}
void CountingStream::waitForEvents(std::uint64_t count) {
    wait([&] { return events_ >= count; });
}
std::uint64_t CountingStream::events() const {
    const std::lock_guard lock(mutex_);
    return events_;
}

void makeHistory(const std::string& root, const std::string& state, std::uint64_t events) {
    fs::create_directories(root);
    {
        const auto store = openLiveStore(root, state);
        if (store->report().events >= events) {
            return;
        }
    }
    fs::remove_all(state);
    openLiveStore(root, state).reset();
    const native::UniqueFD folder(::open(root.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    const auto binding = valueOf(native::RootBinding::of(folder.get(), root));
    const auto stateFolder = native::StateFolder(fs::canonical(state));
    writeEvents(valueOf(stateFolder.storeOf(binding)), state + "/cache", events);
}

}  // namespace marrowdale::benchmarks
