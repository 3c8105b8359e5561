#include <cerrno>
#include <cstddef>
#include <ctime>
#include <filesystem>
#include <numeric>

#include "platform/linux/files/WalkTest.h"

namespace marrowdale::native {
namespace {

double processorSeconds() {
    timespec time{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

class WalkPositionTest : public WalkTest {};
INSTANTIATE_TEST_SUITE_P(OnEach, WalkPositionTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(WalkPositionTest, skipsWithoutHandingOutAndGoesOnBehind) {
    for (int i = 0; i < 30; ++i) {
        folder("sub" + std::to_string(i));
        file("sub" + std::to_string(i) + "/file");
        file("sub" + std::to_string(i) + "/.hidden");
    }
    const Names all = list(deep);
    ASSERT_EQ(all.size(), 60U);
    for (const std::uint64_t count : {0U, 1U, 2U, 17U, 59U, 60U}) {
        const auto walking = walk(request(deep));
        ASSERT_EQ(*walking->skip(count), count);
        std::vector<URL> urls;
        ASSERT_EQ(*walking->next(1000, urls), 60 - count);
    }
    EXPECT_EQ(*walk(request(deep))->skip(1000), 60U);
}

TEST_P(WalkPositionTest, pagesResumedFromPositionsAreTheWholeWalk) {
    for (int i = 0; i < 20; ++i) {
        const std::string sub = "sub" + std::to_string(i);
        folder(sub + "/inner");
        for (int j = 0; j < 11; ++j) {
            file(sub + "/inner/file" + std::to_string(j));
        }
    }
    const Names all = list(deep);
    for (const std::uint64_t limit : {1U, 7U, 64U}) {
        Names seen;
        auto wanted = request(deep);
        while (!wanted.position.atEnd) {
            const auto walking = walk(wanted);
            std::vector<URL> urls;
            ASSERT_LE(*walking->next(limit, urls), limit);
            seen.merge(namesOf(urls));
            wanted.position = walking->position();
        }
        EXPECT_EQ(seen, all);
    }
}

TEST_P(WalkPositionTest, positionsHoldWhileTheFolderChanges) {
    for (int i = 0; i < 300; ++i) {
        file("keep" + std::to_string(i));
        file("go" + std::to_string(i));
    }
    auto wanted = request(flat);
    std::vector<URL> urls;
    const auto first = walk(wanted);
    ASSERT_EQ(*first->next(300, urls), 300U);
    wanted.position = first->position();
    for (int i = 0; i < 300; ++i) {
        std::filesystem::remove(world_.at("go" + std::to_string(i)));
        file("new" + std::to_string(i));
    }
    const auto second = walk(wanted);
    ASSERT_TRUE(second->next(10000, urls));
    const Names seen = namesOf(urls);
    for (int i = 0; i < 300; ++i) {
        EXPECT_EQ(seen.count("keep" + std::to_string(i)), 1U) << i;
    }
}

TEST_P(WalkPositionTest, positionInAFolderThatIsGoneOrReplacedGoesOnBehindIt) {
    for (const char* name : {"a", "b", "c"}) {
        folder(name);
        for (int i = 0; i < 5; ++i) {
            file(std::string(name) + "/file" + std::to_string(i));
        }
    }
    for (const bool replace : {false, true}) {
        auto wanted = request(deep);
        std::vector<URL> urls;
        const auto walking = walk(wanted);
        ASSERT_EQ(*walking->next(3, urls), 3U);  // a folder and two of its files
        wanted.position = walking->position();
        ASSERT_EQ(wanted.position.levels.size(), 2U);
        const std::string inside = wanted.position.levels[1].name;
        std::filesystem::rename(world_.at(inside), world_.at("." + inside));
        if (replace) {
            folder(inside);
            file(inside + "/other");
        }
        std::vector<URL> rest;
        ASSERT_TRUE(walk(wanted)->next(100, rest));
        Names expected;
        for (const std::string name : {"a", "b", "c"}) {
            if (name != inside) {
                expected.insert(name);
                for (int i = 0; i < 5; ++i) {
                    expected.insert(name + "/file" + std::to_string(i));
                }
            }
        }
        Names seen = namesOf(rest);
        seen.erase(inside);  // may be met again as a new entry, with what is in it
        seen.erase(inside + "/other");
        EXPECT_EQ(seen, expected) << (replace ? "replaced" : "gone");
        EXPECT_TRUE(errors_.empty());
        std::filesystem::remove_all(world_.at(inside));
        std::filesystem::rename(world_.at("." + inside), world_.at(inside));
    }
}

TEST_P(WalkPositionTest, positionOfAnotherFolderIsRefused) {
    folder("one");
    folder("two");
    file("one/a");
    file("one/b");
    auto wanted = request(flat);
    wanted.url = world_.url("one");
    std::vector<URL> urls;
    const auto walking = walk(wanted);
    ASSERT_EQ(*walking->next(1, urls), 1U);
    wanted.position = walking->position();
    wanted.url = world_.url("two");
    EXPECT_EQ(world_.files.enumerateDirectory(wanted).error().code, ESTALE);
}

TEST_P(WalkPositionTest, positionWithHostileNamesLeavesTheTreeNever) {
    folder("sub");
    auto wanted = request({});
    const auto walking = walk(wanted);
    std::vector<URL> urls;
    ASSERT_EQ(*walking->next(1, urls), 1U);
    wanted.position = walking->position();
    ASSERT_EQ(wanted.position.levels.size(), 2U);
    for (const char* name : {"..", "../..", "/etc", "sub/../.."}) {
        wanted.position.levels[1].name = name;
        wanted.position.levels[1].folder = FileID{};
        std::vector<URL> rest;
        EXPECT_EQ(*walk(wanted)->next(10, rest), 0U) << name;
    }
}

TEST_P(WalkPositionTest, pagingAFlatFolderIsLinear) {
    constexpr int files = 20000;
    for (int i = 0; i < files; ++i) {
        file("file" + std::to_string(i));
    }
    auto wanted = request(flat);
    wanted.keys = {ResourceKey::fileSize};
    wanted.attributeNames.clear();
    wanted.prefetchStatus = false;
    Names seen;
    std::vector<double> costs;
    while (!wanted.position.atEnd) {
        std::vector<URL> urls;
        const double before = processorSeconds();
        const auto walking = walk(wanted);
        ASSERT_TRUE(walking->next(200, urls));
        costs.push_back(processorSeconds() - before);
        seen.merge(namesOf(urls));
        wanted.position = walking->position();
    }
    EXPECT_EQ(seen.size(), static_cast<std::size_t>(files));
    EXPECT_EQ(std::set<std::string>(seen.begin(), seen.end()).size(), seen.size());
    // A page that walked past the earlier ones would cost the last tenth 19 times the first.
    const auto tenth = static_cast<std::ptrdiff_t>(costs.size() / 10);
    const double first = std::accumulate(costs.begin(), costs.begin() + tenth, 0.0);
    const double last = std::accumulate(costs.end() - tenth, costs.end(), 0.0);
    EXPECT_LT(last, first * 6);
}

}  // namespace
}  // namespace marrowdale::native
