#pragma once

#include <array>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <random>
#include <string>
#include <tuple>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "providers/marrowdale/LocalFileProvider.h"
#include "tests/changes/Replica.h"
#include "tests/support/TestWorld.h"

namespace marrowdale::tests {

// How the store comes to know what happened between two looks.
enum class Following : std::uint8_t {
    live,       // as it happens
    whenAsked,  // it was told, and works through that when somebody asks
    restart,    // a new process finds out
};

using ChangesParameter = std::tuple<TestFileSystem, Following>;

inline std::string changesParameterName(const testing::TestParamInfo<ChangesParameter>& info) {
    static constexpr std::array names{"live", "whenAsked", "restart"};
    return testFileSystemName(testing::TestParamInfo<TestFileSystem>(std::get<0>(info.param), 0)) +
           "_" + names.at(static_cast<std::size_t>(std::get<1>(info.param)));
}

// A provider on real folders with the real store, opened and closed.
class ChangesTestWorld : public testing::TestWithParam<ChangesParameter> {
  protected:
    ChangesTestWorld() { makeFolder(root()); }
    ~ChangesTestWorld() override { close(); }
    ChangesTestWorld(const ChangesTestWorld&) = delete;
    ChangesTestWorld& operator=(const ChangesTestWorld&) = delete;

    [[nodiscard]] Following following() const { return std::get<1>(GetParam()); }
    void open() {
        native::StoreOptions options;
        if (following() == Following::live) {
            options.recording = native::StoreOptions::Recording::live;
        } else if (following() == Following::whenAsked) {
            options.recording = native::StoreOptions::Recording::whenAsked;
        }
        world_ = std::make_unique<TestWorld>(directory_, options);
        provider_ = std::make_unique<LocalFileProvider>(world_->platform);
    }
    void close() {
        provider_.reset();
        world_.reset();
    }
    // Does something that the store comes to know in the way that is tested.
    template <typename Work>
    void meanwhile(Work work) {
        if (following() != Following::restart) {
            work();
            return;
        }
        close();
        work();
        open();
    }
    [[nodiscard]] std::string root() const { return directory_.path("Documents"); }
    [[nodiscard]] std::string path(const std::string& below) const { return root() + "/" + below; }
    [[nodiscard]] LocalFileProvider& provider() { return *provider_; }
    [[nodiscard]] TestWorld& world() { return *world_; }
    [[nodiscard]] std::string identifierOf(const std::string& below) {
        return provider_->persistentIdentifierForItemAtURL(URL::fileURL(path(below))).value_or("");
    }
    std::shared_ptr<CollectingChangeObserver> changes(std::string_view container,
                                                      const Data& anchor) {
        const auto enumerator = provider_->enumeratorForContainerItemIdentifier(container);
        auto observer = std::make_shared<CollectingChangeObserver>();
        (*enumerator)->enumerateChangesForObserver(observer, anchor);
        EXPECT_TRUE(observer->waitForFinish());
        return observer;
    }
    // What is recorded, where a failed test asks for it with MARROWDALE_HISTORY=1.
    void printHistory(EventID since) {
        if (std::getenv("MARROWDALE_HISTORY") == nullptr) {  // NOLINT(concurrency-mt-unsafe)
            return;
        }
        const auto cursor = world_->store->eventsSince(since);
        ASSERT_TRUE(cursor) << cursor.error().description();
        for (auto event = (*cursor)->next(); event && *event; event = (*cursor)->next()) {
            std::cout << raw((*event)->id) << " " << std::hex << ((*event)->flags >> 16U)
                      << std::dec << " " << (*event)->path << " fid=" << raw((*event)->fileID)
                      << " did=" << raw((*event)->goneDocument) << "\n";
        }
    }
    void expectSame(const Replica& replica) {
        auto differences = replica.differences(*provider_);
        differences.resize(std::min<std::size_t>(differences.size(), 10));
        for (const std::string& difference : differences) {
            ADD_FAILURE() << difference;
        }
    }

  private:
    TemporaryDirectory directory_{std::get<0>(GetParam()).dir};
    std::unique_ptr<TestWorld> world_;
    std::unique_ptr<LocalFileProvider> provider_;
};

}  // namespace marrowdale::tests
