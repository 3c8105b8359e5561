#include "tests/powerloss/StoreRun.h"

#include <fcntl.h>
#include <unistd.h>
#include <utility>

#include <gtest/gtest.h>

#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/store/StoreTestSupport.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::tests {

native::StoreOptions storeOptions(const std::string& disk, Workload workload) {
    native::StoreOptions options;
    options.stateFolder = disk + "/state";
    options.cacheFolder = disk + "/cache";
    options.rootPath = disk + "/root";
    if (workload == Workload::snapshots) {
        constexpr std::uint64_t fewEvents = 100;
        options.retention = {std::chrono::seconds(0), fewEvents, fewEvents};
    }
    return options;
}

std::string describe(const native::StoredEvent& event) {
    return std::to_string(event.flags) + " file " + std::to_string(raw(event.fileID)) + " gone " +
           std::to_string(raw(event.goneDocument)) + " " + std::string(event.path);
}

StoreRun::StoreRun(std::string disk, const WriteLog& log, Workload workload, std::uint32_t seed)
    : disk_(std::move(disk)),
      root_(disk_ + "/root"),
      log_(log),
      workload_(workload),
      random_(seed),
      writer_(root_, seed + 1,
              [this](const FileKey& file) { out_.left.push_back({log_.size(), file}); }) {
    makeFolder(root_);
    const native::UniqueFD folder(::open(root_.c_str(), O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(::syncfs(folder.get()), 0);
}

void StoreRun::open() {
    const std::size_t begin = log_.size();
    store_.reset();
    auto options = storeOptions(disk_, workload_);
    isLive_ = random_() % 3 != 0;
    options.recording =
        isLive_ ? native::StoreOptions::Recording::live : native::StoreOptions::Recording::once;
    auto opened = native::Store::open(options);
    ASSERT_TRUE(opened) << opened.error().description();
    store_ = std::move(*opened);
    out_.restarts.push_back({begin, log_.size()});
    const std::uint64_t bytes = store_->report().snapshotBytes;
    snapshots_ += bytes != snapshotBytes_ ? 1 : 0;
    snapshotBytes_ = bytes;
    if (!out_.made) {
        out_.made = {log_.size(), store_->report().uuid};
        whenMade_();
    }
    ASSERT_EQ(store_->report().uuid, out_.made->store);
}

void StoreRun::work(int barriers) {
    constexpr int reopenAfter = 8;
    for (int i = 0; i < barriers && !testing::Test::HasFailure(); ++i) {
        if (i % reopenAfter == 0) {
            open();
        }
        change();
        if (workload_ == Workload::snapshots && i % reopenAfter == reopenAfter / 2) {
            writer_.makeMany();
        }
        askForBarrier();
        if (random_() % 2 == 0) {
            askForDocuments(root_);
            for (const auto& [path, state] : treeBelow(root_)) {
                if (state.isFolder) {
                    askForDocuments(root_ + "/" + path);
                }
            }
        }
    }
    store_.reset();
}

void StoreRun::change() {
    constexpr int most = 6;
    for (int left = static_cast<int>(random_() % most) + 1; left > 0; --left) {
        writer_.step();
    }
}

void StoreRun::askForBarrier() {
    if (!isLive_) {
        const auto done = store_->reconcile();
        ASSERT_TRUE(done) << done.error().description();
    }
    const auto event = store_->barrier();
    ASSERT_TRUE(event) << event.error().description();
    out_.anchors.push_back({log_.size(), *event, treeBelow(root_)});
    readNews();
}

void StoreRun::readNews() {
    if (store_->standingOf(read_) == native::EventHistory::Standing::pruned) {
        ASSERT_EQ(workload_, Workload::snapshots);
        read_ = out_.anchors.back().event;
    }
    auto cursor = store_->eventsSince(read_);
    ASSERT_TRUE(cursor) << cursor.error().description();
    while (true) {
        const auto event = (*cursor)->next();
        ASSERT_TRUE(event) << event.error().description();
        if (!*event) {
            return;
        }
        read_ = (*event)->id;
        out_.told.push_back({log_.size(), read_, describe(**event)});
    }
}

void StoreRun::askForDocuments(const std::string& folder) {
    auto asked = native::makeRequests(folder);
    const auto done = store_->assignDocumentIDs(asked.requests);
    ASSERT_TRUE(done) << done.error().description();
    const std::size_t position = log_.size();
    for (const auto& request : asked.requests) {
        if (request.document != DocumentID{}) {
            const std::string path = folder + "/" + std::string(request.name);
            out_.given.push_back({position,
                                  request.document,
                                  {request.status.fileID, request.status.birth},
                                  path.substr(root_.size() + 1)});
        }
    }
}

}  // namespace marrowdale::tests
