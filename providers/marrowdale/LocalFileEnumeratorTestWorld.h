#pragma once

#include <algorithm>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingObserver.h"
#include "platform/testing/FakeFileEventService.h"
#include "platform/testing/ForwardingFileEventService.h"
#include "platform/testing/PlatformVariants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {

inline const Data& byName = VantrelInitialPageSortedByName();

// The real volume, with the events that a test says.
class ScriptedEvents : public ForwardingFileEventService {
  public:
    using ForwardingFileEventService::ForwardingFileEventService;
    FakeFileEventService script;

    Expected<EventID> currentEventID() override { return script.currentEventID(); }
    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
        return script.makeStream(std::move(request));
    }
};

// Listings of real folders, page by page; since the last page nothing happened but what a test
// says.
class LocalFileEnumeratorTestWorld : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    using Names = std::vector<std::string>;

    LocalFileEnumeratorTestWorld() {
        events_.script.history = FakeFileEventService::emptyHistory();
    }
    LocalFileEnumerator enumerator(
        std::string_view container = VantrelRootContainerItemIdentifier) {
        return {platform_, std::string(container), {world_.manager.documentStorageURL()}};
    }
    CollectingObserver page(const Data& data,
                            std::string_view container = VantrelRootContainerItemIdentifier) {
        CollectingObserver observer;
        enumerator(container).enumerateItemsForObserver(observer, data);
        EXPECT_EQ(observer.finishes, 1);
        return observer;
    }
    static Names sorted(Names names) {
        std::ranges::sort(names);
        return names;
    }
    void makeFiles(std::string_view prefix, int count) {
        for (int i = 0; i < count; ++i) {
            writeFile(world_.path(std::string(prefix) + std::to_string(i)), "");
        }
    }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
    ScriptedEvents events_{world_.fileEvents};
    const Platform platform_ = withFileEvents(world_.platform, events_);
};

}  // namespace marrowdale
