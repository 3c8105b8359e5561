// Power is cut at any moment while a store works, and comes back.

#include <algorithm>
#include <cstdlib>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/powerloss/CutCheck.h"
#include "tests/powerloss/PowerCuts.h"
#include "tests/powerloss/PowerLossTestBase.h"
#include "tests/powerloss/StoreRun.h"
#include "tests/powerloss/SyncSwitch.h"

namespace marrowdale::tests {
namespace {

// How many times as much as by default is to be tried.
std::size_t stress() {
    const char* value = std::getenv("MARROWDALE_STRESS");  // NOLINT(concurrency-mt-unsafe)
    return value == nullptr ? 1 : std::max<std::size_t>(1, std::strtoul(value, nullptr, 10));
}

// How long one run is.
struct Extent {
    int barriers;
    std::size_t cuts;
};

constexpr Extent extentOf(Workload workload) {
    return workload == Workload::ordinary ? Extent{60, 20} : Extent{28, 8};
}

class PowerLossTest : public PowerLossTestBase, public testing::WithParamInterface<DiskFormat> {
  protected:
    void SetUp() override {
        PowerLossTestBase::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        MARROWDALE_SKIP_WITHOUT(GetParam());
        fresh_.emplace(GetParam().make());
    }
    void TearDown() override { setSyncs(Syncs::kept); }

    // Lets a store work; `whenMade` is called when it is there.
    void record(
        Workload workload, std::uint32_t seed, const std::function<void()>& whenMade = [] {}) {
        workload_ = workload;
        image_.emplace(imageFolder(), *fresh_);
        const auto disk = mount(image_->path(), GetParam());
        ASSERT_TRUE(disk);
        StoreRun run(diskFolder(), image_->log(), workload, seed);
        first_ = image_->log().size();
        run.whenMade(whenMade);
        run.work(extentOf(workload).barriers);
        snapshots_ += run.snapshots();
        setSyncs(Syncs::kept);
        out_ = run.handedOut();
        last_ = image_->log().size();
    }

    // Where power is cut: often the moment when something was handed out or while the store was
    // closed and opened, else anywhere.
    [[nodiscard]] std::vector<std::size_t> positions(std::mt19937& random) const {
        std::vector<std::size_t> found;
        for (std::size_t i = 0; i < extentOf(workload_).cuts; ++i) {
            if (i % 4 == 0) {
                found.push_back(out_.anchors[random() % out_.anchors.size()].position);
            } else if (i % 4 == 1 && !out_.given.empty()) {
                found.push_back(out_.given[random() % out_.given.size()].position);
            } else if (i % 4 == 2) {
                const auto& restart = out_.restarts[random() % out_.restarts.size()];
                found.push_back(restart.begin + random() % (restart.end - restart.begin + 1));
            } else {
                found.push_back(first_ + random() % (last_ - first_ + 1));
            }
        }
        std::ranges::sort(found);
        return found;
    }

    // What is wrong after power cuts, with the number of the cut before it.
    [[nodiscard]] std::vector<std::string> complaintsAfterCuts(std::uint32_t seed) {
        std::mt19937 random(seed);
        PowerCuts cuts(*fresh_, image_->log(), GetParam().atom);
        std::vector<std::string> complaints;
        for (const std::size_t position : positions(random)) {
            const auto cutSeed = static_cast<std::uint32_t>(random());
            const MemoryFile after = cuts.at(position, cutSeed);
            const auto disk = mount(after.path(), GetParam());
            if (!disk) {
                continue;
            }
            CutCheck check(diskFolder(), workload_, out_, position);
            for (const std::string& complaint : check.run()) {
                complaints.push_back("cut at " + std::to_string(position) + " of " +
                                     std::to_string(last_) + " (seed " + std::to_string(cutSeed) +
                                     "): " + complaint);
            }
            documentsFound_ += check.documentsFound();
            differences_ += check.differences();
        }
        return complaints;
    }

    void tryAll(Workload workload) {
        for (std::uint32_t seed = 1; seed <= stress(); ++seed) {
            record(workload, seed);
            ASSERT_FALSE(HasFailure()) << "in run " << seed;
            for (const std::string& complaint : complaintsAfterCuts(seed)) {
                ADD_FAILURE() << "run " << seed << ", " << complaint;
            }
        }
        EXPECT_GT(documentsFound(), 0U);
        EXPECT_GT(differences(), 0U);
    }

    [[nodiscard]] std::size_t documentsFound() const { return documentsFound_; }
    [[nodiscard]] std::size_t differences() const { return differences_; }
    [[nodiscard]] int snapshots() const { return snapshots_; }

  private:
    std::optional<MemoryFile> fresh_;
    std::optional<LoggedImage> image_;
    HandedOut out_;
    std::size_t first_ = 0;
    std::size_t last_ = 0;
    std::size_t documentsFound_ = 0;
    std::size_t differences_ = 0;
    Workload workload_ = Workload::ordinary;
    int snapshots_ = 0;
};

TEST_P(PowerLossTest, NothingThatWasHandedOutIsLostOrConfused) {
    tryAll(Workload::ordinary);
}

TEST_P(PowerLossTest, NorWhereSnapshotsReplaceTheLog) {
    tryAll(Workload::snapshots);
    EXPECT_GT(snapshots(), 0);
}

// Whether this would see what it looks for.
TEST_P(PowerLossTest, AStoreWhoseSyncsDoNothingIsFoundOut) {
    record(Workload::ordinary, 1, [] { setSyncs(Syncs::ignored); });
    ASSERT_FALSE(HasFailure());
    const auto complaints = complaintsAfterCuts(1);
    EXPECT_THAT(complaints, testing::Contains(testing::HasSubstr(": event ")));
    EXPECT_THAT(complaints, testing::Contains(testing::HasSubstr(": document ")));
}

INSTANTIATE_TEST_SUITE_P(OnEach, PowerLossTest, testing::ValuesIn(diskFormats()), diskFormatName);

}  // namespace
}  // namespace marrowdale::tests
