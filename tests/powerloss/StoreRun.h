#pragma once

#include <functional>
#include <memory>
#include <random>
#include <string>

#include "platform/linux/store/Store.h"
#include "tests/powerloss/HandedOut.h"
#include "tests/powerloss/TreeWriter.h"
#include "tests/powerloss/WriteLog.h"

namespace marrowdale::tests {

enum class Workload : std::uint8_t {
    ordinary,
    // Much at once, and little history is kept: there are snapshots, and segments are removed.
    snapshots,
};

// Where a store and its root folder are on the disk that is mounted on `disk`.
[[nodiscard]] native::StoreOptions storeOptions(const std::string& disk, Workload workload);

// An event as text, all that is told of it.
[[nodiscard]] std::string describe(const native::StoredEvent& event);

// A store at work on a disk whose writes are logged, beside somebody who changes the tree. Keeps
// account of everything it hands out. One thread; a problem is a failure of the test.
class StoreRun {
  public:
    // The root folder is made, and lasts, before anything else.
    StoreRun(std::string disk, const WriteLog& log, Workload workload, std::uint32_t seed);

    // Opens the store and works until there are so many barriers.
    void work(int barriers);
    // Called once, when the store was made.
    void whenMade(std::function<void()> call) { whenMade_ = std::move(call); }

    [[nodiscard]] const HandedOut& handedOut() const { return out_; }
    // How many snapshots there were, seen at the restarts.
    [[nodiscard]] int snapshots() const { return snapshots_; }

  private:
    void open();
    void change();
    void askForBarrier();
    void readNews();
    void askForDocuments(const std::string& folder);

    std::string disk_;
    std::string root_;
    const WriteLog& log_;
    Workload workload_;
    std::mt19937 random_;
    HandedOut out_;
    TreeWriter writer_;
    std::function<void()> whenMade_ = [] {};
    EventID read_{};  // the newest event that was told
    bool isLive_ = false;
    int snapshots_ = 0;
    std::uint64_t snapshotBytes_ = 0;
    std::unique_ptr<native::Store> store_;
};

}  // namespace marrowdale::tests
