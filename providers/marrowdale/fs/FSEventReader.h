#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/Mutex.h"
#include "providers/marrowdale/fs/FSEventReaderDelegate.h"
#include "providers/marrowdale/fs/FSEventReaderGatherPhaseResumeStatus.h"

namespace marrowdale {

enum class FSEventReaderMode : std::uint8_t {
    pathBased,   // what happens at and below the monitored folders
    docIDBased,  // the storage root's volume's feed of documents that came to rest on another file
};

// Reads one stream of events and tells its delegate what they mean for the items in the monitored
// folders: this one changed, that one is gone, the history ends here, start over.
//
// An event is a hint. What stands at its path is looked at when the event is handled, and the item
// is made from that. An event that says that a file is gone is told as the file's deletion when
// nothing, or another file, stands at the path by now; where the same file stands there again it is
// a change, and where that file is another document now, the earlier one is told as deleted:
// numbers of files are given out again. A path is hidden when a component of it below the monitored
// folder begins with "."; what is hidden, or outside all monitored folders, is never told.
//
// Two things are gone to those who know them though their file is not, and are told as deletions of
// their documents, besides what the event of their old place tells: what was moved to where it is
// hidden or not monitored, and a package that was renamed and is an ordinary folder now. Where such
// a move is read so late that what was moved is not there any more, its document, and what was in
// it, are told when an event says that they are gone from there.
//
// An event of the feed of documents is told as a change of the item that holds the document now,
// wherever that is; so it runs through the same looks (hidden, monitored, present, servable) with
// the path that was found, and the file that the event names is not compared: the document may have
// come to rest on yet another file since.
//
// Log: `verbose` readers log each start, stop, batch, event and decision at debug level (wrapped
// identifiers at info level), each event in a section of its own. Lost events, and events that
// can't be read, are logged by every reader.
//
// Threads: everything may be called from any thread, and from within the delegate's calls. All
// delegate calls come on `streamQueue`. Released on its own queue (by the delegate) as well as
// elsewhere.
class FSEventReader : public std::enable_shared_from_this<FSEventReader> {
    struct Private {};
    // From one start to the stop that ends it.
    struct Run {
        std::atomic<bool> isStopped = false;
    };

  public:
    static constexpr std::string_view queueLabel = "marrowdale.fsevents-stream";
    static constexpr std::chrono::milliseconds latency{500};

    struct Options {
        std::vector<URL> urls;
        FSEventReaderMode mode = FSEventReaderMode::pathBased;
        // Events after this one are told.
        EventID lastProcessedFSEventID{};
        bool verbose = false;
        // Not kept alive: once it is gone, events are discarded.
        std::weak_ptr<FSEventReaderDelegate> delegate;
    };
    // `platform` lives longer than the reader. Not started yet.
    [[nodiscard]] static std::shared_ptr<FSEventReader> make(const Platform& platform,
                                                             Options options);
    FSEventReader(Private, const Platform& platform, Options options);
    FSEventReader(const FSEventReader&) = delete;
    FSEventReader& operator=(const FSEventReader&) = delete;
    // A stream that still runs is stopped, after a line in the log: its owner forgot it.
    ~FSEventReader();

    // Makes the stream, from lastProcessedFSEventID on, and starts it; nothing for a reader that
    // runs. Ends the process where the system has no means for another stream. A storage root whose
    // volume can't be told makes a stream on volume 0, of which the service says that events were
    // dropped.
    void start();
    // No delegate call begins after it returned on the queue itself, or once a block that was
    // handed to the queue after it begins; the rest of a batch is neither told nor counted. Nothing
    // for a reader that does not run.
    void stop();

    // The newest event that was handled: told in full, or dropped. Advanced behind each event,
    // never backwards, so that a reader that starts from here misses nothing; the event during
    // which the delegate asks is not yet counted. A wrapped identifier does not count. Whoever was
    // told to start over does not start from here.
    [[nodiscard]] EventID lastProcessedFSEventID() const { return lastProcessedFSEventID_.load(); }
    [[nodiscard]] const SerialQueue& streamQueue() const { return streamQueue_; }
    [[nodiscard]] const std::vector<URL>& urls() const { return urls_; }
    [[nodiscard]] FSEventReaderMode mode() const { return mode_; }
    [[nodiscard]] bool verbose() const { return verbose_; }
    // Between a start and its stop.
    [[nodiscard]] bool isRunning() const;
    // <FSEventReader:ADDRESS since:EVENT urls:[URL, …] mode:MODE>
    [[nodiscard]] std::string description() const;

    // Whether a listing of `on` that began behind `previousEventID` may go on: replays the history
    // since then, with a reader of its own, and waits for its end. The wait ends because every
    // history ends: the service tells so after a loss, for folders that are gone, and when it shuts
    // down too. It must outlive the call, as the platform does. The error is that of reading the
    // current event. Not to be called on a queue that the service needs for its answers.
    [[nodiscard]] static Expected<FSEventReaderGatherPhaseResume> canResumeGatherPhase(
        const Platform& platform, const std::vector<URL>& on, EventID previousEventID);

    // The UUID of the history of the volume that holds the URL; none when it has no history.
    [[nodiscard]] static std::optional<UUID> volumeUUID(const Platform& platform, const URL& url);

  private:
    enum class Place : std::uint8_t { visible, hidden, notMonitored };
    enum class Comparison : std::uint8_t { withTheEventsFile, none };

    [[nodiscard]] FileEventStreamRequest request(const std::shared_ptr<Run>& run);
    static void end(std::unique_ptr<FileEventStream> stream);

    // What happens to events: FSEventReaderEvents.cpp. Each handler answers whether the event was
    // handled to its end; false when the reader was stopped before that.
    void handleBatch(const Run& run, std::span<const FileEvent> events);
    void allocateDocuments(std::span<const FileEvent> events) const;
    void countAsProcessed(EventID eventID);
    [[nodiscard]] bool handle(const Run& run, FSEventReaderDelegate& delegate,
                              const FileEvent& event);
    [[nodiscard]] bool handlePath(const Run& run, FSEventReaderDelegate& delegate,
                                  const FileEvent& event);
    [[nodiscard]] bool handleDocumentPath(const Run& run, FSEventReaderDelegate& delegate,
                                          const FileEvent& event);
    [[nodiscard]] bool handleURL(const Run& run, FSEventReaderDelegate& delegate,
                                 const FileEvent& event, const URL& url, Comparison comparison);
    [[nodiscard]] bool handleItem(const Run& run, FSEventReaderDelegate& delegate,
                                  const FileEvent& event, const URL& url,
                                  std::optional<FileID> otherFile) const;
    [[nodiscard]] bool tellOutOfSight(const Run& run, FSEventReaderDelegate& delegate,
                                      const FileEvent& event, const URL& url);
    [[nodiscard]] bool tellGoneOutOfSight(const Run& run, FSEventReaderDelegate& delegate,
                                          const FileEvent& event, const URL& url);
    // That place itself, or one in it; `path` is absolute.
    [[nodiscard]] bool isBelowUntold(std::string_view path) const;
    [[nodiscard]] bool tellDocumentAt(const Run& run, FSEventReaderDelegate& delegate,
                                      const FileEvent& event, const URL& url) const;
    [[nodiscard]] bool tellDeletions(const Run& run, FSEventReaderDelegate& delegate,
                                     const FileEvent& event, const URL& url) const;
    // False when the reader was stopped before.
    [[nodiscard]] bool tellDeletion(const Run& run, FSEventReaderDelegate& delegate,
                                    const FileEvent& event, const URL& url,
                                    const std::string& identifier) const;
    [[nodiscard]] Place placeOf(const URL& url) const;
    [[nodiscard]] bool isInPackage(const URL& url) const;
    // At debug level, for a verbose reader.
    template <typename MakeText>
    void logDecision(MakeText&& makeText) const {
        if (verbose_) {
            platform_.log.debug(std::forward<MakeText>(makeText));
        }
    }

    const Platform& platform_;
    const std::vector<URL> urls_;
    const FSEventReaderMode mode_;
    const bool verbose_;
    const std::weak_ptr<FSEventReaderDelegate> delegate_;
    const SerialQueue streamQueue_{queueLabel};
    std::atomic<EventID> lastProcessedFSEventID_;
    // Places out of sight to which something was moved that was not there any more when the event's
    // turn came, so that nobody was told of its document, and whether it is known to have left
    // since. On the queue alone.
    std::map<std::string, bool, std::less<>> untold_;
    mutable Mutex mutex_;
    std::unique_ptr<FileEventStream> stream_ MARROWDALE_GUARDED_BY(mutex_);
    std::shared_ptr<Run> run_ MARROWDALE_GUARDED_BY(mutex_);  // of stream_
};

}  // namespace marrowdale
