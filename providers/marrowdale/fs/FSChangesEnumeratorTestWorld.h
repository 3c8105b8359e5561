#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/fs/FSChangesEnumerator.h"
#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"

namespace marrowdale {

// Remembers the queue of the stream that was made last, and has a history of its own for each kind
// of stream: of the whole root, of the feed of documents, of a folder in the root.
class PassEvents : public FakeFileEventService {
  public:
    std::optional<SerialQueue> queue;
    std::string rootPath;
    std::vector<FileEvent> pathHistory;
    std::vector<FileEvent> documentHistory;
    std::vector<FileEvent> folderHistory;

    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
        queue = request.queue;
        history.clear();
        const bool isOfRoot = request.paths == std::vector{rootPath};
        const auto& told = request.device ? documentHistory
                           : isOfRoot     ? pathHistory
                                          : folderHistory;
        if (!told.empty()) {
            history.push_back(told);
        }
        return FakeFileEventService::makeStream(std::move(request));
    }
};

// Real files, and requests for changes whose streams tell what a test says.
class FSChangesEnumeratorTestWorld : public FSEventReaderTestWorld {
  protected:
    static constexpr std::string_view workingSet = VantrelWorkingSetContainerItemIdentifier;
    static constexpr std::string_view root = VantrelRootContainerItemIdentifier;
    static constexpr std::string_view allDirectories = VantrelAllDirectoriesContainerItemIdentifier;

    FSChangesEnumeratorTestWorld() {
        passes_.rootPath = world_.root();
        token_.deviceUUID = passes_.uuid;
        token_.streamEventID = 10;
    }
    ~FSChangesEnumeratorTestWorld() override { settle(); }
    FSChangesEnumeratorTestWorld(const FSChangesEnumeratorTestWorld&) = delete;
    FSChangesEnumeratorTestWorld& operator=(const FSChangesEnumeratorTestWorld&) = delete;

    void begin(std::string_view container = workingSet) {
        observer_ = std::make_shared<CollectingChangeObserver>();
        observer_->within = within_;
        enumerator_ = FSChangesEnumerator::make(platform_, token_, std::string(container),
                                                {world_.manager.documentStorageURL()}, observer_);
        enumerator_->start();
    }
    std::shared_ptr<FakeFileEventStream> stream() { return passes_.streams().back(); }
    // And waits until what came of the batch was told, behind its end too.
    void tell(std::vector<FileEvent> events) {
        const auto told = stream();
        told->tell(std::move(events));
        told->drain();
    }
    FileEvent done() { return streamEvent(FileEventFlag::historyDone); }
    FileEvent doneAt(std::uint64_t id) {
        FileEvent event = done();
        event.id = EventID{id};
        return event;
    }
    // Ends both passes.
    void endHistory() {
        const FileEvent end = done();
        tell({end});
        tell({doneAt(token_.streamEventID)});
    }
    // One that stands there, changed.
    FileEvent changed(std::string_view name) {
        return event(name, FileEventFlag::changed, fileIDOf(name));
    }
    FileEvent movedHere(std::string_view name) {
        return event(name, FileEventFlag::renamed | FileEventFlag::isFolder, fileIDOf(name));
    }
    std::vector<FileEvent> deletions(std::uint64_t first, std::size_t count) {
        std::vector<FileEvent> events;
        for (std::size_t i = 0; i < count; ++i) {
            events.push_back(gone("gone", FileID{first + i}));
        }
        return events;
    }
    [[nodiscard]] std::optional<FSChangeToken> anchor() const {
        const auto data = observer_->anchor();
        const auto token = data ? FSChangeToken::decode(*data) : Expected<FSChangeToken>();
        return token ? std::optional(*token) : std::nullopt;
    }
    // The next request goes on where the last one ended.
    void goOn(std::string_view container = workingSet) {
        const auto token = anchor();
        ASSERT_TRUE(token);
        token_ = *token;
        begin(container);
        ASSERT_TRUE(observer_->waitForFinish());
    }
    // Lets go of the enumerator, and waits until nothing of it runs any more.
    void settle() {
        if (enumerator_) {
            enumerator_->stop();
        }
        enumerator_.reset();
        passes_.queue.reset();
        FSRetiredReaders::of(platform_).waitUntilGone();
    }
    std::shared_ptr<LocalItem> itemAt(std::string_view name) {
        return LocalItem::initWithURL(platform_, world_.url(name));
    }

    PassEvents passes_;
    const Platform platform_ = withFileEvents(world_.platform, passes_);
    FSChangeToken token_;
    std::function<void(const std::string&)> within_;
    std::shared_ptr<CollectingChangeObserver> observer_;
    std::shared_ptr<FSChangesEnumerator> enumerator_;
};

}  // namespace marrowdale
