#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/Mutex.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "providers/marrowdale/fs/FSChangeToken.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"
#include "providers/marrowdale/fs/FSEventReader.h"
#include "providers/marrowdale/fs/FSScanOffset.h"
#include "providers/marrowdale/fs/FSWalkCursors.h"

namespace marrowdale {

// Answers one request for changes: reads the history since the anchor's event, first by path, then
// the feed of documents that came to rest on another file, and tells the observer which items of
// the container changed and which are gone. It ends with the first of
//   - the end of the second pass: a new anchor, nothing more to come;
//   - the 200th change: an anchor from which the rest follows, more to come;
//   - lost events: errorSyncAnchorExpired();
//   - a folder that can't be scanned because identifiers can't be made durable: that error.
// After that, and after `stop`, nothing is told; whatever still comes is ignored.
//
// Updates are told one by one, as they come. Deletions are collected: told before the next update,
// at the end of a batch of events and before the finish; they count when they are collected.
//
// A folder that was renamed inside the trees is one event, though everything in it has another path
// now. For the working set it is told and then walked, and so is everything in it told; for all
// directories the folders in it. The walk counts like any change, so it may need several requests:
// the anchor between them lies before the folder's event, and its offset says how far the walk has
// got (FSScanOffset). The folder itself is not told again when the walk goes on.
//
// An anchor says how far the path pass has come: it never passes an event of which a part was not
// told, nor, in the second pass, what the first one has seen. The token's other fields are kept.
//
// Threads: `start` and `stop` from any. Observer calls, and everything else, on the queue of the
// reader of the pass; the second pass has a reader of its own, and what the first one still tells
// is ignored. Readers end as FSRetiredReaders does it. The observer is released with the finish or
// with `stop`.
class FSChangesEnumerator : public FSEventReaderDelegate,
                            public std::enable_shared_from_this<FSChangesEnumerator> {
    struct Private {};

  public:
    // Changes told in one request.
    static constexpr std::uint64_t batchSize = 200;

    // `urls` is not empty: an empty one is a mistake of the caller and ends the process. Not
    // started yet. `platform` lives longer.
    [[nodiscard]] static std::shared_ptr<FSChangesEnumerator> make(
        const Platform& platform, const FSChangeToken& token, std::string container,
        std::vector<URL> urls, std::shared_ptr<FileProviderChangeObserver> observer);
    FSChangesEnumerator(Private, const Platform& platform, const FSChangeToken& token,
                        std::string container, std::vector<URL> urls,
                        std::shared_ptr<FileProviderChangeObserver> observer);
    FSChangesEnumerator(const FSChangesEnumerator&) = delete;
    FSChangesEnumerator& operator=(const FSChangesEnumerator&) = delete;
    ~FSChangesEnumerator() override;

    // Once. Nothing for one that was stopped.
    void start();
    // The request ends without a word. No observer call begins after it, but for one that was just
    // about to be made on the reader's queue.
    void stop();

    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                    const FileEvent& event) override;
    void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                    const FileEvent& event) override;
    void fsEventReaderDidFinishHistory(EventID eventID) override;
    void fsEventReaderMustReset() override;

  private:
    using Observer = std::shared_ptr<FileProviderChangeObserver>;
    using Reader = std::shared_ptr<FSEventReader>;

    [[nodiscard]] Reader makeReader(FSEventReaderMode mode);
    // Null when the caller is not to be listened to: the request is over, or the caller is the
    // first pass's queue within the second.
    [[nodiscard]] Observer listeningObserver() const;
    [[nodiscard]] EventID lastProcessedEvent() const;

    enum class Batch : std::uint8_t { open, full };
    // Adds to the changes told.
    [[nodiscard]] Batch count(std::uint64_t changes);
    [[nodiscard]] Batch forwardUpdate(const std::shared_ptr<LocalItem>& item,
                                      const FileEvent& event);
    void queueDeletion(const std::string& identifier);
    void flushDeletions();
    void flushBehindBatch();
    void logIgnored(const std::string& identifier, std::string_view reason) const;
    void leaveToTheRoot() const;
    void beginDocumentPass();

    // The walk of a renamed folder: FSChangesEnumeratorScan.cpp.
    [[nodiscard]] bool isScanned(const LocalItem& item, const FileEvent& event) const;
    void tellFolder(const std::shared_ptr<LocalItem>& folder, const FileEvent& event);
    [[nodiscard]] FSScanOffset offsetOfScan(const URL& folder, const FileEvent& event);
    void scan(const URL& folder, const FileEvent& event, FSScanOffset offset);
    [[nodiscard]] FSDirectoryEnumerator scanRequest(const URL& folder, FSScanOffset offset) const;
    [[nodiscard]] Batch forwardScanned(const std::vector<URL>& urls);
    [[nodiscard]] FSWalkCursorKey cursorKey(const URL& folder, EventID eventID,
                                            FSScanOffset offset) const;

    // How much of the event at which the batch is full was told.
    enum class Told : std::uint8_t { inPart, whole };
    void finishEarly(const FileEvent& event, Told told, std::uint64_t offset = 0);
    void finish(MoreComing moreComing);
    void finish(const Error& error);
    // Ends the request; its observer, for the last call, the first time.
    Observer end();

    const Platform& platform_;
    // Guarded by nothing: touched on the queue of the pass's reader, which is made after the last
    // one's was left.
    FSChangeToken currentToken_;
    std::uint64_t numberOfChanges_ = 0;
    const std::string container_;
    mutable Mutex mutex_;
    Reader reader_ MARROWDALE_GUARDED_BY(mutex_);      // null once the request is over
    Observer observer_ MARROWDALE_GUARDED_BY(mutex_);  // null once the request is over
    bool shouldProcessedFSEventsDocIDBased_ = true;
    const EventID sinceFSEventID_;
    EventID maxFSEventID_;

    const std::vector<URL> urls_;
    std::vector<std::string> queuedDeletions_;
    bool flushIsOnItsWay_ = false;
};

}  // namespace marrowdale
