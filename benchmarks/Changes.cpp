#include <algorithm>
#include <array>
#include <future>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>

#include "benchmarks/History.h"
#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "benchmarks/Watchman.h"
#include "benchmarks/World.h"
#include "host/requests/FeedJson.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::benchmarks {
namespace {

constexpr std::array<std::uint64_t, 3> counts{1, 1'000, 10'000};

// Keeps one answer.
class AnswerKeeper final : public FileProviderChangeObserver {
  public:
    void didUpdateItems(std::vector<FileProviderItemPtr> items) override {
        changes_.updated.insert(changes_.updated.end(), items.begin(), items.end());
    }
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override {
        changes_.deleted.insert(changes_.deleted.end(), identifiers.begin(), identifiers.end());
    }
    void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) override {
        changes_.anchor = std::move(anchor);
        changes_.moreComing = moreComing;
        answer_.set_value(std::nullopt);
    }
    void finishEnumeratingWithError(const Error& error) override { answer_.set_value(error); }

    // Waits for the end. Throws what the provider answered.
    [[nodiscard]] const host::ItemChanges& wait() {
        if (const auto error = answer_.get_future().get()) {
            throw std::runtime_error(error->description());
        }
        return changes_;
    }

  private:
    host::ItemChanges changes_;
    std::promise<std::optional<Error>> answer_;
};

Data anchorNow(World& world) {
    std::optional<Data> anchor;
    const auto enumerator = world.provider().enumeratorForContainerItemIdentifier(
        VantrelWorkingSetContainerItemIdentifier);
    (*enumerator)->currentSyncAnchorWithCompletionHandler([&](const auto& data) { anchor = data; });
    if (!anchor) {
        throw std::runtime_error("no anchor");
    }
    return *anchor;
}

struct Heard {
    std::uint64_t items = 0;
    std::uint64_t bytes = 0;  // of JSON
};

// Answer by answer, each asked for with the anchor of the one before alone, until no more come.
Heard changesSince(World& world, Data anchor) {
    Heard heard;
    for (bool more = true; more;) {
        const auto enumerator = world.provider().enumeratorForContainerItemIdentifier(
            VantrelWorkingSetContainerItemIdentifier);
        const auto keeper = std::make_shared<AnswerKeeper>();
        (*enumerator)->enumerateChangesForObserver(keeper, anchor);
        const host::ItemChanges& changes = keeper->wait();
        heard.items += changes.updated.size();
        heard.bytes += host::changesJson(changes).size();
        anchor = changes.anchor;
        more = changes.moreComing == MoreComing::yes;
    }
    return heard;
}

std::string nameOf(std::uint64_t count) {
    return std::to_string(count) + (count == 1 ? " change" : " changes");
}

// Both have everything of the tree, see the same changes one after the other, and never watch at
// once.
class Feeds {
  public:
    explicit Feeds(const Tree& tree) : tree_(tree) {}

    void addTo(Contest& contest, std::uint64_t most) {
        for (const std::uint64_t count : counts) {
            if (count <= most) {
                contest.add("ours " + nameOf(count), [this, count] { return ours(count); });
            }
        }
        if (!hasPeer("watchman")) {
            return;
        }
        for (const std::uint64_t count : counts) {
            if (count <= most) {
                contest.add("theirs " + nameOf(count), [this, count] { return theirs(count); });
            }
        }
    }

  private:
    Duration ours(std::uint64_t count) {
        watchman_.reset();
        if (!world_) {
            world_ = std::make_unique<World>(tree_.path, Suite::stateFolder(tree_),
                                             native::StoreOptions::Recording::live);
            (void)listPages(*world_, containerOf(false));
        }
        const Data anchor = anchorNow(*world_);
        change(count);
        (void)recorded(world_->store());
        Heard heard;
        const Duration took = timed([&] { heard = changesSince(*world_, anchor); });
        if (heard.items < count) {
            throw std::runtime_error("changes were not told");
        }
        return took;
    }
    Duration theirs(std::uint64_t count) {
        world_.reset();
        if (!watchman_) {
            watchman_ = std::make_unique<Watchman>();
            watchman_->watch(tree_.path);
        }
        const std::string clock = watchman_->clock(tree_.path);
        change(count);
        (void)watchman_->clock(tree_.path);
        return timed([&] { (void)watchman_->since(tree_.path, clock, Watchman::Fields::status); });
    }
    void change(std::uint64_t count) {
        for (const std::string& path : randomFiles(tree_, count, ++choice_)) {
            touch(path);
        }
    }

    Tree tree_;
    std::unique_ptr<World> world_;
    std::unique_ptr<Watchman> watchman_;
    std::uint64_t choice_ = 0;
};

}  // namespace

void compareChanges(Suite& suite) {
    const Tree tree = suite.nestedTree(true);
    makeTree(tree);
    Feeds feeds(tree);
    Contest contest;
    const std::uint64_t most = tree.files;
    feeds.addTo(contest, most);
    contest.run(suite.sizes.rounds);
    suite.table.heading("What changed since an anchor, as JSON, of " + std::to_string(most) +
                        " files with 3 attributes");
    for (const std::uint64_t count : counts) {
        if (count > most) {
            continue;
        }
        const std::string ours = "ours " + nameOf(count);
        if (!hasPeer("watchman")) {
            suite.table.note(nameOf(count) + ": " + inWords(contest.median(ours).count()) +
                             "; there is no watchman");
            continue;
        }
        const std::string theirs = "theirs " + nameOf(count);
        suite.table.add(
            {.what = nameOf(count) + ", items in batches of 200, against `since` with stat fields",
             .measured = inWords(contest.median(ours).count()),
             .against = inWords(contest.median(theirs).count()),
             .ratio = contest.ratio(ours, theirs),
             .target = 2.0});
    }
    if (counts.back() <= most) {
        const double few = contest.median("ours " + nameOf(1'000)).count();
        const double many = contest.median("ours " + nameOf(10'000)).count();
        suite.table.add({.what = "one of 10000 changes, against one of 1000",
                         .measured = each(many, 10'000),
                         .against = each(few, 1'000),
                         .ratio = many / few / 10,
                         .target = 1.5});
    }
}

}  // namespace marrowdale::benchmarks
