#include "providers/marrowdale/fs/FSEventReader.h"

#include <array>
#include <charconv>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "providers/marrowdale/fs/FSGatherPhaseChecker.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentFeed = "/.docid";

std::string_view name(FSEventReaderMode mode) {
    return mode == FSEventReaderMode::pathBased ? "pathBased" : "docIDBased";
}

std::string address(const void* object) {
    std::array<char, 2 * sizeof(std::uintptr_t)> digits{};
    // The address is only shown.
    const auto number = reinterpret_cast<std::uintptr_t>(object);  // NOLINT
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number, 16).ptr;
    return "0x" + std::string(digits.data(), end);
}

std::string listOf(const std::vector<URL>& urls) {
    std::string text;
    for (const URL& url : urls) {
        text += (text.empty() ? "" : ", ") + url.absoluteString();
    }
    return "[" + text + "]";
}

std::vector<std::string> pathsOf(const std::vector<URL>& urls) {
    std::vector<std::string> paths;
    paths.reserve(urls.size());
    for (const URL& url : urls) {
        paths.push_back(url.path());
    }
    return paths;
}

}  // namespace

std::shared_ptr<FSEventReader> FSEventReader::make(const Platform& platform, Options options) {
    return std::make_shared<FSEventReader>(Private{}, platform, std::move(options));
}

FSEventReader::FSEventReader(Private /*unused*/, const Platform& platform, Options options)
    : platform_(platform),
      urls_(std::move(options.urls)),
      mode_(options.mode),
      verbose_(options.verbose),
      delegate_(std::move(options.delegate)),
      lastProcessedFSEventID_(options.lastProcessedFSEventID) {}

FSEventReader::~FSEventReader() {
    std::unique_ptr<FileEventStream> stream;
    {
        const MutexLock lock(mutex_);
        stream = std::move(stream_);
    }
    if (stream) {
        platform_.log.error("stream deleted without being stopped; " + description());
        end(std::move(stream));
    }
}

void FSEventReader::start() {
    const MutexLock lock(mutex_);
    if (stream_) {
        return;
    }
    logDecision([this] { return "starting " + description(); });
    run_ = std::make_shared<Run>();
    stream_ = platform_.fileEvents.makeStream(request(run_));
    if (!stream_) {
        fatalError("can't create an event stream for " + description());
    }
    stream_->start();
}

FileEventStreamRequest FSEventReader::request(const std::shared_ptr<Run>& run) {
    FileEventStreamRequest request{.paths = pathsOf(urls_),
                                   .device = {},
                                   .since = lastProcessedFSEventID(),
                                   .latency = latency,
                                   .creationFlags = FileEventCreationFlag::valueTypes |
                                                    FileEventCreationFlag::fileEvents |
                                                    FileEventCreationFlag::extendedData,
                                   .queue = streamQueue_,
                                   .callback = {}};
    if (mode_ == FSEventReaderMode::docIDBased) {
        request.paths = {std::string(documentFeed)};
        request.device = deviceID(platform_, platform_.manager.documentStorageURL());
    }
    // Weak, or the stream that the reader owns would keep the reader. Copies, because a stop within
    // the batch lets go of this function and of what it captured.
    request.callback = [weak = weak_from_this(), run](std::span<const FileEvent> events) {
        const auto reader = weak.lock();
        const auto own = run;  // NOLINT(performance-unnecessary-copy-initialization)
        if (reader) {
            reader->handleBatch(*own, events);
        }
    };
    return request;
}

void FSEventReader::stop() {
    std::unique_ptr<FileEventStream> stream;
    {
        const MutexLock lock(mutex_);
        if (!stream_) {
            return;
        }
        run_->isStopped = true;
        stream = std::move(stream_);
    }
    end(std::move(stream));
    logDecision([this] { return "stopped " + description(); });
}

void FSEventReader::end(std::unique_ptr<FileEventStream> stream) {
    stream->stop();
    stream->invalidate();
}

bool FSEventReader::isRunning() const {
    const MutexLock lock(mutex_);
    return stream_ != nullptr;
}

std::string FSEventReader::description() const {
    return "<FSEventReader:" + address(this) +
           " since:" + std::to_string(raw(lastProcessedFSEventID())) + " urls:" + listOf(urls_) +
           " mode:" + std::string(name(mode_)) + ">";
}

Expected<FSEventReaderGatherPhaseResume> FSEventReader::canResumeGatherPhase(
    const Platform& platform, const std::vector<URL>& on, EventID previousEventID) {
    const auto eventID = platform.fileEvents.currentEventID();
    if (!eventID) {
        return Unexpected(eventID.error());
    }
    const auto checker = std::make_shared<FSGatherPhaseChecker>();
    const auto reader = make(platform, {.urls = on,
                                        .mode = FSEventReaderMode::pathBased,
                                        .lastProcessedFSEventID = previousEventID,
                                        .verbose = false,
                                        .delegate = checker});
    reader->start();
    checker->sema.wait();
    // Behind the batch in which the history ended, so that nothing of it is left out.
    reader->streamQueue().sync([&] { reader->stop(); });
    return FSEventReaderGatherPhaseResume{.status = checker->gatherPhaseResumeStatus,
                                          .eventID = *eventID};
}

std::optional<UUID> FSEventReader::volumeUUID(const Platform& platform, const URL& url) {
    const auto uuid = platform.fileEvents.volumeUUID(url);
    return uuid ? std::optional<UUID>(*uuid) : std::nullopt;
}

}  // namespace marrowdale
