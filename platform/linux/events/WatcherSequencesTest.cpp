#include <algorithm>
#include <filesystem>

#include "platform/linux/events/WatcherTestOperations.h"
#include "platform/linux/events/WatcherTestSequence.h"
#include "platform/linux/events/WatcherTestWorld.h"

namespace marrowdale::native {
namespace {

std::vector<std::string> sequenceNames() {
    std::vector<std::string> names;
    for (const auto& entry :
         std::filesystem::directory_iterator(programFolder() + "/event-sequences")) {
        names.push_back(entry.path().stem().string());
    }
    std::sort(names.begin(), names.end());
    return names;
}

using Param = std::tuple<TestFileSystem, Watcher::Kind, std::string>;

constexpr auto paramName = [](const auto& info) {
    const testing::TestParamInfo<WatcherParam> watcher(
        {std::get<0>(info.param), std::get<1>(info.param)}, info.index);
    std::string name = watcherParamName(watcher) + "_" + std::get<2>(info.param);
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
};

class WatcherSequencesTest : public testing::TestWithParam<Param> {
  protected:
    void watch(const std::vector<std::string>& words) {
        const std::string& path = words[1];
        numbers_[path] = world_.numberOf(path);
        if (words[0] == "root") {
            world_.watchRoot(path);
        } else if (words[0] == "watch") {
            world_.watch(path);
        } else {
            const auto watched =
                world_.watcher().watchFile(world_.open(path, O_RDONLY).get(), numbers_[path]);
            ASSERT_TRUE(watched) << watched.error().description();
        }
    }

    void drain() {
        const Told told = world_.drain();
        EXPECT_FALSE(told.overflowed);
        hints_.insert(hints_.end(), told.hints.begin(), told.hints.end());
    }

    [[nodiscard]] bool concerns(const KeptHint& hint,
                                const WatcherTestSequence::Expectation& one) const {
        const FileID number = numbers_.at(one.folder);
        return one.isFile ? hint.file == number
                          : raw(hint.file) == 0 && hint.folder == number && hint.name == one.name;
    }

    void expectTold(const WatcherTestSequence::Expectation& one) const {
        std::uint32_t what = 0;
        bool origin = !one.knowsOrigin;
        const FileID from = one.fromFolder.empty() ? FileID{} : numbers_.at(one.fromFolder);
        for (const KeptHint& hint : hints_) {
            if (concerns(hint, one)) {
                what |= hint.what;
                origin = origin || ((hint.what & WatchHint::movedTo) != 0 &&
                                    hint.fromFolder == from && hint.fromName == one.fromName);
            }
        }
        EXPECT_EQ(what & one.bits, one.bits) << one.folder << " " << one.name;
        EXPECT_TRUE(origin) << one.folder << " " << one.name << testing::PrintToString(hints_);
    }

    [[nodiscard]] bool isAllowed(const KeptHint& hint, const WatcherTestSequence& sequence) const {
        const auto& all = sequence.expected;
        return std::any_of(all.begin(), all.end(),
                           [&](const auto& one) { return concerns(hint, one); }) ||
               std::any_of(sequence.allowed.begin(), sequence.allowed.end(), [&](const auto& may) {
                   const std::string start = may.second.substr(0, may.second.find('*'));
                   const bool named =
                       start == may.second ? hint.name == start : hint.name.starts_with(start);
                   return hint.folder == numbers_.at(may.first) && named;
               });
    }

    WatcherWorld world_{std::get<0>(GetParam()).dir, std::get<1>(GetParam())};
    std::map<std::string, FileID> numbers_;
    std::vector<KeptHint> hints_;
};
INSTANTIATE_TEST_SUITE_P(OnEach, WatcherSequencesTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Watcher::Kind::fanotify,
                                                          Watcher::Kind::inotify),
                                          testing::ValuesIn(sequenceNames())),
                         paramName);

TEST_P(WatcherSequencesTest, tellsWhatIsDone) {
    const WatcherTestSequence sequence = WatcherTestSequence::read(
        programFolder() + "/event-sequences/" + std::get<2>(GetParam()) + ".txt",
        kindName(std::get<1>(GetParam())));
    WatcherTestOperations operations([&](const std::string& path) { return world_.at(path); });
    for (const auto& words : sequence.before) {
        operations.run(words);
    }
    for (const auto& words : sequence.watched) {
        watch(words);
    }
    (void)world_.drain();
    for (const auto& words : sequence.steps) {
        words[0] == "drain" ? drain() : operations.run(words);
    }
    drain();
    for (const auto& one : sequence.expected) {
        expectTold(one);
    }
    for (const KeptHint& hint : hints_) {
        EXPECT_TRUE(isAllowed(hint, sequence)) << testing::PrintToString(hint);
    }
}

}  // namespace
}  // namespace marrowdale::native
