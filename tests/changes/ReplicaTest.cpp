// Whatever is done to the trees, a client that goes by changes knows what a fresh enumeration
// tells. Step by step: some things are done, the client follows, both are compared.

#include <filesystem>

#include "providers/marrowdale/fs/FSChangeToken.h"
#include "tests/changes/ChangesTestWorld.h"
#include "tests/history/RandomWriter.h"

namespace marrowdale::tests {
namespace {

class ReplicaTest : public ChangesTestWorld {
  protected:
    // How many times as long as usual the test takes.
    static int stress() {
        const char* value = std::getenv("MARROWDALE_STRESS");  // NOLINT(concurrency-mt-unsafe)
        const long times = value != nullptr ? std::strtol(value, nullptr, 10) : 1;
        return times > 0 && times <= 1000 ? static_cast<int>(times) : 1;
    }
    // A new one each time, or that of MARROWDALE_SEED; printed, so that a failure can be had again.
    static std::uint32_t newSeed() {
        const char* value = std::getenv("MARROWDALE_SEED");  // NOLINT(concurrency-mt-unsafe)
        const std::uint32_t seed =
            value != nullptr ? static_cast<std::uint32_t>(std::strtoul(value, nullptr, 10))
                             : std::random_device()();
        std::cout << "seed " << seed << "\n";
        return seed;
    }
    void trashSomething(std::mt19937& random) {
        std::error_code ignored;
        const std::string trash = path(".Trash");
        std::filesystem::create_directory(trash, ignored);
        static constexpr std::array names{"A", "B", "C", "a", "b.txt", "c", "d.png"};
        const std::string name = names.at(random() % names.size());
        const bool isPutBack = random() % 3 == 0;
        std::filesystem::rename(isPutBack ? trash + "/" + name : path(name),
                                isPutBack ? path(name) : trash + "/" + name, ignored);
    }
    void follow(std::uint32_t seed, int steps, int operations, HardLinks hardLinks) {
        RandomWriter writer(root(), seed, hardLinks);
        std::mt19937 random(seed);
        open();
        Replica replica;
        replica.fill(provider());
        for (int step = 0; step < steps && !HasFailure(); ++step) {
            meanwhile([&] {
                for (int i = 0; i < operations; ++i) {
                    writer.step();
                    if (random() % 20 == 0) {
                        trashSomething(random);
                    }
                }
            });
            const auto before = FSChangeToken::decode(replica.anchor());
            ASSERT_TRUE(before && replica.catchUp(provider())) << "step " << step;
            SCOPED_TRACE("step " + std::to_string(step) + " of seed " + std::to_string(seed));
            expectSame(replica);
            if (HasFailure()) {
                printHistory(EventID{before->streamEventID});
            }
        }
    }
};

INSTANTIATE_TEST_SUITE_P(OnEach, ReplicaTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::live, Following::whenAsked,
                                                          Following::restart)),
                         changesParameterName);

TEST_P(ReplicaTest, aClientThatFollowsKnowsWhatAFreshEnumerationTells) {
    follow(newSeed(), 20, 25 * stress(), HardLinks::leftOut);
}

// What runs only where MARROWDALE_STRESS is set. Known: a client keeps one place of a document that
// has several; where that goes out of sight with its folder, or is the name of a link, the other
// names are not always told.
class ReplicaOfHardLinksTest : public ReplicaTest {};

std::vector<Following> byHand() {
    // NOLINTNEXTLINE(concurrency-mt-unsafe)
    return std::getenv("MARROWDALE_STRESS") == nullptr
               ? std::vector<Following>()
               : std::vector{Following::live, Following::whenAsked, Following::restart};
}

INSTANTIATE_TEST_SUITE_P(ByHand, ReplicaOfHardLinksTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::ValuesIn(byHand())),
                         changesParameterName);
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(ReplicaOfHardLinksTest);

TEST_P(ReplicaOfHardLinksTest, aClientThatFollowsKnowsWhatAFreshEnumerationTells) {
    follow(newSeed(), 20, 25 * stress(), HardLinks::made);
}

}  // namespace
}  // namespace marrowdale::tests
