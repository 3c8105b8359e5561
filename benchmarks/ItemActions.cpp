#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <stdexcept>
#include <sys/xattr.h>
#include <system_error>
#include <unistd.h>
#include <vector>

#include "benchmarks/ActionCalls.h"
#include "benchmarks/Measurement.h"
#include "benchmarks/Suite.h"
#include "platform/linux/files/UniqueFD.h"
#include "providers/marrowdale/actions/ActionCompletion.h"
#include "providers/marrowdale/items/TagData.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

void moveBare(const std::string& from, const std::string& to) {
    if (::renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) != 0) {
        throw std::system_error(errno, std::generic_category(), from);
    }
}

// Files that are renamed, moved and trashed, all of them once in each turn, there and back.
class Items {
  public:
    Items(const std::string& folder, std::uint64_t count)
        : root_(folder + "/items/Documents"),
          count_(count),
          world_(made(root_), folder + "/items/state") {
        for (std::uint64_t i = 0; i < count_; ++i) {
            const native::UniqueFD file(
                ::open(path("a", i).c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
        }
        for (std::uint64_t i = 0; i < count_; ++i) {
            identifiers_.push_back(identifierAt(world_, path("a", i)));
        }
        other_ = identifierAt(world_, root_ + "/b");
    }

    Duration rename() {
        const Duration took = eachItem([&](std::uint64_t i) {
            static_cast<void>(itemOf([&](auto handler) {
                world_.provider().renameItemWithIdentifier(identifiers_[i], name(i) + " renamed",
                                                           handler);
            }));
        });
        moveBack("a", " renamed");
        return took;
    }
    Duration move() {
        const Duration took = eachItem([&](std::uint64_t i) {
            static_cast<void>(itemOf([&](auto handler) {
                world_.provider().reparentItemWithIdentifier(identifiers_[i], other_, std::nullopt,
                                                             handler);
            }));
        });
        moveBack("b", "");
        return took;
    }
    Duration trash() {
        const Duration took = eachItem([&](std::uint64_t i) {
            static_cast<void>(itemOf([&](auto handler) {
                world_.provider().trashItemWithIdentifier(identifiers_[i], handler);
            }));
        });
        moveBack(".Trash", "");
        return took;
    }
    // The one call that must be, and the item that is answered.
    Duration bare(const std::string& folder, const std::string& suffix) {
        const Duration took = eachItem([&](std::uint64_t i) {
            const std::string to = path(folder, i) + suffix;
            moveBare(path("a", i), to);
            if (!freshItemAt(world_.platform(), URL::fileURL(to))) {
                throw std::runtime_error("no item at " + to);
            }
        });
        moveBack(folder, suffix);
        return took;
    }

    Duration tag() {
        return eachItem([&](std::uint64_t i) {
            static_cast<void>(itemOf([&](auto handler) {
                world_.provider().setTagData(tags_, identifiers_[i], handler);
            }));
        });
    }
    Duration setAttribute(bool withItem) {
        return eachItem([&](std::uint64_t i) {
            const std::string at = path("a", i);
            if (::setxattr(at.c_str(), "user.com.quillory.metadata:_kMDItemUserTags",
                           tags_.bytes().data(), tags_.size(), 0) != 0) {
                throw std::system_error(errno, std::generic_category(), at);
            }
            if (withItem && !freshItemAt(world_.platform(), URL::fileURL(at))) {
                throw std::runtime_error("no item at " + at);
            }
        });
    }

  private:
    static const std::string& made(const std::string& root) {
        for (const char* folder : {"/a", "/b", "/.Trash"}) {
            fs::create_directories(root + folder);
        }
        return root;
    }
    static std::string name(std::uint64_t number) {
        return "document " + std::to_string(number) + ".txt";
    }
    [[nodiscard]] std::string path(const std::string& folder, std::uint64_t number) const {
        return root_ + "/" + folder + "/" + name(number);
    }
    template <typename Work>
    Duration eachItem(const Work& work) const {
        return timed([&] {
            for (std::uint64_t i = 0; i < count_; ++i) {
                work(i);
            }
        });
    }
    // By the provider, which is not surprised then by what it finds. Not measured.
    void moveBack(const std::string& folder, const std::string& suffix) {
        for (std::uint64_t i = 0; i < count_; ++i) {
            moveBare(path(folder, i) + suffix, path("a", i));
            static_cast<void>(freshItemAt(world_.platform(), URL::fileURL(path("a", i))));
        }
    }

    std::string root_;
    std::uint64_t count_;
    World world_;
    std::vector<std::string> identifiers_;
    std::string other_;
    Data tags_ = *encodeTagData({{.label = "Work"}, {.label = "2026"}});
};

}  // namespace

void compareItemActions(Suite& suite) {
    {
        Items items(suite.folder, suite.sizes.actedOn);
        Contest contest;
        contest.add("rename", [&] { return items.rename(); });
        contest.add("bare rename", [&] { return items.bare("a", " renamed"); });
        contest.add("move", [&] { return items.move(); });
        contest.add("bare move", [&] { return items.bare("b", ""); });
        contest.add("trash", [&] { return items.trash(); });
        contest.add("bare trash", [&] { return items.bare(".Trash", ""); });
        contest.add("tag", [&] { return items.tag(); });
        contest.add("setxattr", [&] { return items.setAttribute(false); });
        contest.add("setxattr and item", [&] { return items.setAttribute(true); });
        contest.run(suite.sizes.rounds * 2);
        const auto addRow = [&](const std::string& what, const std::string& ours,
                                const std::string& floor, std::optional<double> target) {
            const auto count = static_cast<double>(suite.sizes.actedOn);
            suite.table.add({.what = what,
                             .measured = each(contest.median(ours).count(), count),
                             .against = each(contest.median(floor).count(), count),
                             .ratio = contest.ratio(ours, floor),
                             .target = target});
        };
        suite.table.heading("Actions on one item");
        for (const std::string action : {"rename", "move", "trash"}) {
            addRow(action + ", against renameat2 and the making of the item", action,
                   "bare " + action, 1.5);
        }
        addRow("setting tags, against setxattr", "tag", "setxattr", 1.5);
        addRow("the same, against setxattr and the making of the item", "tag", "setxattr and item",
               {});
    }
    fs::remove_all(suite.folder + "/items");
}

}  // namespace marrowdale::benchmarks
