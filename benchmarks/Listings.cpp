#include <memory>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "benchmarks/Floor.h"
#include "benchmarks/Measurement.h"
#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"

namespace marrowdale::benchmarks {
namespace {

constexpr const char* everyFindField =
    "%p %f %h %P %y %Y %l %s %k %b %m %M %n %i %D %F %u %g %U %G %d %A+ %T+ %C+ %B+\\n";

// One tree listed in every way.
class ListingComparison {
  public:
    ListingComparison(Suite& suite, Tree tree, std::string name)
        : suite_(suite), tree_(std::move(tree)), name_(std::move(name)) {}

    void run() {
        makeTree(tree_);
        addFloors();
        addOurs();
        addPeers();
        contest_.run(suite_.sizes.rounds);
        report();
    }

  private:
    void addFloor(const std::string& name, FloorCalls calls) {
        contest_.add(name, [this, calls] {
            return timed([&] { check(floorListing(tree_.path, calls).entries); });
        });
    }

    void addFloors() {
        addFloor("status", FloorCalls::statusOnly);
        addFloor("current folder", FloorCalls::attributesByCurrentFolder);
        if (kernelHasAttributesByFolderHandle()) {
            addFloor("folder handle", FloorCalls::attributesByFolderHandle);
        }
    }

    void addOurs() {
        contest_.add("first", [this] {
            world_.reset();
            forgetState(Suite::stateFolder(tree_));
            return listInFreshWorld();
        });
        contest_.add("later", [this] { return listInFreshWorld(); });
        contest_.add("cached", [this] { return list(); });
    }

    // A fresh world has read no attributes yet.
    Duration listInFreshWorld() {
        world_.reset();
        world_ = std::make_unique<World>(tree_.path, Suite::stateFolder(tree_));
        return list();
    }

    Duration list() {
        return timed([&] { check(listPages(*world_, containerOf(tree_.folders == 0))); });
    }

    void addPeers() {
        if (hasPeer("gio")) {
            contest_.addForRounds("gio", 1, [this] { return runPeer(gioArguments()); });
        }
        contest_.addForRounds(
            "find", 2, [this] { return runPeer({"find", tree_.path, "-printf", everyFindField}); });
    }

    [[nodiscard]] std::vector<std::string> gioArguments() const {
        std::vector<std::string> arguments{"gio", "list", "-a", "*", tree_.path};
        const std::uint64_t perFolder = tree_.folders == 0 ? 1 : tree_.files / tree_.folders;
        for (std::uint64_t folder = 0; folder < tree_.folders; ++folder) {
            const std::string path = filePath(tree_, folder * perFolder);
            arguments.push_back(path.substr(0, path.rfind('/')));
        }
        return arguments;
    }

    void check(std::uint64_t entries) const {
        if (entries != tree_.entries()) {
            throw std::runtime_error(name_ + ": " + std::to_string(entries) +
                                     " entries were listed");
        }
    }

    [[nodiscard]] std::string attributeFloor() const {
        if (!kernelHasAttributesByFolderHandle()) {
            return "current folder";
        }
        return contest_.ratio("folder handle", "current folder") < 1 ? "folder handle"
                                                                     : "current folder";
    }

    void addRow(const std::string& what, const std::string& ours, const std::string& floor,
                std::optional<double> target) {
        const auto entries = static_cast<double>(tree_.entries());
        suite_.table.add({.what = what,
                          .measured = each(contest_.median(ours).count(), entries),
                          .against = each(contest_.median(floor).count(), entries),
                          .ratio = contest_.ratio(ours, floor),
                          .target = target});
    }

    void report() {
        const std::string floor = attributeFloor();
        suite_.table.heading(name_ + ", an entry");
        addRow("pages, attributes not cached, against getdents64 + statx + list-then-get", "later",
               floor, tree_.hasAttributes ? 1.2 : 1.5);
        addRow("pages, attributes cached, against getdents64 + statx", "cached", "status", 1.3);
        addRow("first listing ever: identifiers given out and synced", "first", floor, {});
        if (hasPeer("gio")) {
            addRow("`gio list -a '*'` against our pages", "gio", "later", {});
        }
        addRow("`find -printf`, every field but attributes, against our pages", "find", "later",
               {});
    }

    Suite& suite_;
    Tree tree_;
    std::string name_;
    std::unique_ptr<World> world_;
    Contest contest_;
};

}  // namespace

void compareListings(Suite& suite) {
    const std::string nested = std::to_string(suite.sizes.files) + " files in " +
                               std::to_string(suite.sizes.folders) + " folders";
    const std::string flat = "one folder of " + std::to_string(suite.sizes.files) + " files";
    ListingComparison(suite, suite.nestedTree(false), nested + ", no attributes").run();
    ListingComparison(suite, suite.nestedTree(true), nested + ", 3 attributes").run();
    ListingComparison(suite, suite.flatTree(false), flat + ", no attributes").run();
    ListingComparison(suite, suite.flatTree(true), flat + ", 3 attributes").run();
}

}  // namespace marrowdale::benchmarks
