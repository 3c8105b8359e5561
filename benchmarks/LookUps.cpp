#include <random>
#include <stdexcept>
#include <unistd.h>
#include <vector>

#include "benchmarks/Floor.h"
#include "benchmarks/Measurement.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::benchmarks {
namespace {

template <typename T>
T valueOf(Expected<T> result) {
    if (!result) {
        throw std::runtime_error(result.error().description());
    }
    return std::move(*result);
}

std::vector<std::string> somePaths(const Tree& tree, std::uint64_t count) {
    std::mt19937_64 random(1);  // the same ones in every run
    std::uniform_int_distribution<std::uint64_t> number(0, tree.files - 1);
    std::vector<std::string> paths;
    for (std::uint64_t i = 0; i < count; ++i) {
        paths.push_back(filePath(tree, number(random)));
    }
    return paths;
}

// The documents that are looked up, by everything that they go by.
struct Documents {
    std::vector<std::string> paths;
    std::vector<URL> urls;
    std::vector<std::string> identifiers;
    std::vector<native::EntryStatus> statuses;

    Documents(World& world, const Tree& tree, std::uint64_t count) : paths(somePaths(tree, count)) {
        for (const std::string& path : paths) {
            urls.push_back(URL::fileURL(path));
            const auto identifier = world.provider().persistentIdentifierForItemAtURL(urls.back());
            if (!identifier) {
                throw std::runtime_error("no identifier for " + path);
            }
            identifiers.push_back(*identifier);
            statuses.push_back(valueOf(native::statEntry(-100, path.c_str())));  // AT_FDCWD
        }
    }
};

void addOurs(Contest& contest, World& world, const Documents& documents) {
    contest.add("path of file", [&] {
        return timed([&] {
            for (const auto& status : documents.statuses) {
                (void)valueOf(world.store().pathForFileID(status.device, status.fileID));
            }
        });
    });
    contest.add("URL of identifier", [&] {
        return timed([&] {
            for (const std::string& identifier : documents.identifiers) {
                if (!world.provider().URLForItemWithPersistentIdentifier(identifier)) {
                    throw std::runtime_error("no URL for " + identifier);
                }
            }
        });
    });
    contest.add("document of file", [&] {
        return timed([&] {
            for (const std::string& path : documents.paths) {
                const auto status = valueOf(native::statEntry(-100, path.c_str()));  // AT_FDCWD
                if (world.store().knownDocumentID(status) == DocumentID{}) {
                    throw std::runtime_error("no document identifier for " + path);
                }
            }
        });
    });
    contest.add("document of path", [&] {
        return timed([&] {
            for (const URL& url : documents.urls) {
                (void)valueOf(world.platform().fileSystem.resourceValue(
                    url.withoutCachedValues(), ResourceKey::documentIdentifier));
            }
        });
    });
}

}  // namespace

void compareLookUps(Suite& suite) {
    const Tree tree = suite.nestedTree(false);
    makeTree(tree);
    World world(tree.path, Suite::stateFolder(tree));
    const Documents documents(world, tree, suite.sizes.lookUps);
    const bool isRoot = ::geteuid() == 0;

    Contest contest;
    std::unique_ptr<FloorHandles> handles;
    if (isRoot) {
        handles = std::make_unique<FloorHandles>(tree.path, documents.paths);
        contest.add("handles", [&] { return timed([&] { (void)handles->readAllPaths(); }); });
    }
    contest.add("statx", [&] { return timed([&] { (void)floorStatus(documents.paths); }); });
    addOurs(contest, world, documents);
    contest.run(suite.sizes.rounds * 2);

    const auto addRow = [&](const std::string& what, const std::string& ours,
                            const std::string& floor, std::optional<double> target) {
        const auto count = static_cast<double>(documents.paths.size());
        suite.table.add({.what = what,
                         .measured = each(contest.median(ours).count(), count),
                         .against = each(contest.median(floor).count(), count),
                         .ratio = contest.ratio(ours, floor),
                         .target = target});
    };
    suite.table.heading("Look-ups, one of " + std::to_string(tree.files) + " files");
    if (isRoot) {
        addRow("path from identifier, against open_by_handle_at + readlink", "path of file",
               "handles", 0.5);
        addRow("the whole request, from `did=N` to URL, against the same", "URL of identifier",
               "handles", {});
    }
    addRow("document identifier of a known file: a statx and the index, against one statx",
           "document of file", "statx", 2.0);
    addRow("the same asked of a bare URL, reached past no link and no mount, against one statx",
           "document of path", "statx", {});
}

}  // namespace marrowdale::benchmarks
