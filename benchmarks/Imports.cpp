#include <array>
#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <random>
#include <system_error>
#include <unistd.h>
#include <vector>

#include "benchmarks/ActionCalls.h"
#include "benchmarks/Measurement.h"
#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

// Bytes that no file system can leave out or compress.
void makeLargeFile(const std::string& path, std::uint64_t bytes) {
    const native::UniqueFD file(
        ::open(path.c_str(), O_CREAT | O_TRUNC | O_WRONLY | O_CLOEXEC, 0644));
    std::mt19937_64 random(1);
    std::vector<std::uint64_t> block((1U << 20U) / sizeof(std::uint64_t));
    for (std::uint64_t written = 0; file && written < bytes; written += 1U << 20U) {
        for (std::uint64_t& word : block) {
            word = random();
        }
        if (::write(file.get(), block.data(), 1U << 20U) != ssize_t{1U << 20U}) {
            throw std::system_error(errno, std::generic_category(), path);
        }
    }
    ::fsync(file.get());
}

void makeSmallFiles(const std::string& folder, std::uint64_t count) {
    fs::create_directories(folder);
    const std::string text(1'000, 'x');
    for (std::uint64_t i = 0; i < count; ++i) {
        const std::string path = folder + "/small file number " + std::to_string(i);
        const native::UniqueFD file(::open(path.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
        if (!file || ::write(file.get(), text.data(), text.size()) < 0) {
            throw std::system_error(errno, std::generic_category(), path);
        }
    }
}

// Copies into one folder, which is emptied between two of them. Each begins with nothing left to
// be written by what came before.
class Copies {
  public:
    Copies(World& world, std::string folder, std::string source)
        : world_(world), folder_(std::move(folder)), source_(std::move(source)) {
        fs::create_directories(folder_);
        identifier_ = identifierAt(world_, folder_);
    }
    Duration ours() {
        clear();
        return timed([&] { importInto(world_, source_, identifier_); });
    }
    Duration peer(std::vector<std::string> command) {
        clear();
        command.push_back(source_);
        command.push_back(folder_);
        return runPeer(command);
    }
    Duration peerAndSync(const std::vector<std::string>& command) {
        const Duration copied = peer(command);
        return copied + timed([&] {
                   const native::UniqueFD folder(::open(folder_.c_str(), O_RDONLY | O_CLOEXEC));
                   ::syncfs(folder.get());
               });
    }

  private:
    void clear() {
        fs::remove_all(folder_);
        fs::create_directories(folder_);
        identifier_ = identifierAt(world_, folder_);
        ::sync();
    }

    World& world_;
    std::string folder_;
    std::string source_;
    std::string identifier_;
};

void addCopies(Suite& suite, Copies copies, const std::string& what,
               const std::vector<std::string>& command, double target) {
    Contest contest;
    contest.add("ours", [&] { return copies.ours(); });
    contest.add("peer", [&] { return copies.peer(command); });
    contest.add("synced", [&] { return copies.peerAndSync(command); });
    contest.run(suite.sizes.rounds);
    const std::string name = "`" + command[0] + " " + command[1] + "`";
    for (const auto& [peer, against, most] :
         {std::tuple("peer", what + ", synced, against " + name + ", not synced",
                     std::optional<double>()),
          std::tuple("synced", what + ", synced, against " + name + " and a sync",
                     std::optional(target))}) {
        suite.table.add({.what = against,
                         .measured = inWords(contest.median("ours").count()),
                         .against = inWords(contest.median(peer).count()),
                         .ratio = contest.ratio("ours", peer),
                         .target = most});
    }
}

void compareImportsIn(Suite& suite, const std::string& folder) {
    const std::string root = folder + "/imports";
    fs::remove_all(root);
    fs::create_directories(root + "/tree");
    makeLargeFile(root + "/large", suite.sizes.importBytes);
    makeSmallFiles(root + "/small", suite.sizes.smallFiles);
    {
        World world(root + "/tree", root + "/state");
        addCopies(suite, Copies(world, root + "/tree/large", root + "/large"),
                  "a file of " + std::to_string(suite.sizes.importBytes >> 20U) + " MiB",
                  {"cp", "--reflink=auto"}, 1.05);
        addCopies(suite, Copies(world, root + "/tree/small", root + "/small"),
                  std::to_string(suite.sizes.smallFiles) + " small files", {"cp", "-a"}, 1.3);
    }
    fs::remove_all(root);
}

void compareDeletion(Suite& suite) {
    const Tree tree{suite.folder + "/deleted/tree/below", suite.sizes.folders, suite.sizes.files,
                    false};
    const auto make = [&] {
        fs::create_directories(suite.folder + "/deleted/tree");
        fs::remove(tree.path + ".complete");
        makeTree(tree);
        ::sync();
    };
    make();
    {
        World world(suite.folder + "/deleted/tree", suite.folder + "/deleted/state");
        Contest contest;
        contest.add("ours", [&] {
            make();
            const std::string item = identifierAt(world, tree.path);
            return timed([&] { deleteItem(world, item); });
        });
        contest.add("rm", [&] {
            make();
            return runPeer({"rm", "-rf", tree.path});
        });
        contest.run(suite.sizes.rounds);
        suite.table.add(
            {.what = "deleting " + std::to_string(tree.entries()) + " entries, against `rm -rf`",
             .measured = inWords(contest.median("ours").count()),
             .against = inWords(contest.median("rm").count()),
             .ratio = contest.ratio("ours", "rm"),
             .target = 1.2});
    }
    fs::remove_all(suite.folder + "/deleted");
}

}  // namespace

void compareImports(Suite& suite) {
    suite.table.heading("Importing");
    compareImportsIn(suite, suite.folder);
    if (suite.copyingFolder) {
        suite.table.heading("Importing on a file system that shares blocks");
        compareImportsIn(suite, *suite.copyingFolder);
    }
    suite.table.heading("Deleting a tree");
    compareDeletion(suite);
}

}  // namespace marrowdale::benchmarks
