#include <algorithm>
#include <limits>
#include <stdexcept>
#include <vector>

#include "benchmarks/Measurement.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/ParentFolderCache.h"

namespace marrowdale::benchmarks {
namespace {

// The same items, made of one walk that is never interrupted.
std::uint64_t listInOneWalk(World& world, const std::string& path) {
    const Platform& platform = world.platform();
    FSDirectoryEnumerator walk;
    walk.urls = {URL::fileURL(path)};
    walk.limit = std::numeric_limits<std::uint64_t>::max();
    walk.keys = LocalItem::listingKeys();
    walk.attributeNames = {std::string(LocalItem::xattrLastUsedDateName),
                           std::string(LocalItem::xattrTagDataName),
                           std::string(LocalItem::xattrFavoriteRankName)};
    std::vector<URL> urls;
    if (const auto walked = walk.enumerate(platform, urls); !walked) {
        throw std::runtime_error(walked.error().description());
    }
    ParentFolderCache parents(platform);
    std::uint64_t count = 0;
    LocalItem::Options options;
    options.hasLumenoDomainIdentifier = true;
    for (const URL& url : urls) {
        count += LocalItem::initWithURL(platform, url, options, &parents) ? 1U : 0U;
    }
    return count;
}

// How long each page took, the time between two that are handed on.
std::vector<double> pageTimes(World& world) {
    std::vector<double> times;
    auto before = std::chrono::steady_clock::now();
    listPages(world, containerOf(true), [&](const std::vector<FileProviderItemPtr>& items) {
        const auto now = std::chrono::steady_clock::now();
        if (items.size() == LocalFileEnumerator::pageSize) {
            times.push_back(Duration(now - before).count());
        }
        before = now;
    });
    return times;
}

double medianOf(std::vector<double>::const_iterator begin,
                std::vector<double>::const_iterator end) {
    std::vector<double> values(begin, end);
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

}  // namespace

void comparePaging(Suite& suite) {
    const Tree tree = suite.flatTree(false);
    makeTree(tree);
    World world(tree.path, Suite::stateFolder(tree));
    listPages(world, containerOf(true));

    Contest contest;
    contest.add("pages", [&] { return timed([&] { listPages(world, containerOf(true)); }); });
    contest.add("walk", [&] { return timed([&] { listInOneWalk(world, tree.path); }); });
    contest.run(suite.sizes.rounds);

    // One page is too short to be measured alone: the middle of the first and of the last tenth.
    std::vector<double> firsts;
    std::vector<double> lasts;
    for (int round = 0; round < suite.sizes.rounds; ++round) {
        const std::vector<double> times = pageTimes(world);
        const auto tenth = static_cast<std::ptrdiff_t>(std::max<std::size_t>(1, times.size() / 10));
        firsts.push_back(medianOf(times.begin(), times.begin() + tenth));
        lasts.push_back(medianOf(times.end() - tenth, times.end()));
    }
    const double first = medianOf(firsts.begin(), firsts.end());
    const double last = medianOf(lasts.begin(), lasts.end());

    suite.table.heading("Pages of 200, one folder of " + std::to_string(tree.files) + " files");
    suite.table.add({.what = "all pages, against one uninterrupted walk that makes the same items",
                     .measured = inWords(contest.median("pages").count()),
                     .against = inWords(contest.median("walk").count()),
                     .ratio = contest.ratio("pages", "walk"),
                     .target = 1.3});
    suite.table.add({.what = "last pages against first pages",
                     .measured = inWords(last),
                     .against = inWords(first),
                     .ratio = last / first,
                     .target = 1.5});
}

}  // namespace marrowdale::benchmarks
