#pragma once

#include <cstdlib>
#include <filesystem>
#include <functional>
#include <future>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>

#include "platform/testing/TemporaryDirectory.h"
#include "providers/marrowdale/LocalFileProvider.h"
#include "tests/support/TestWorld.h"

namespace marrowdale::tests {

// How many times as long as usual tests run: MARROWDALE_STRESS.
[[nodiscard]] int stress();

// A provider on real folders with the real store, and what a host has it do; each call waits for
// its answer. The storage root is "Documents", with the folder "box" in it, for the root itself
// takes in nothing; "outside" beside it is not served.
//
// Opened and closed as processes start and end; while it is closed no thread of it runs.
class ActionsWorld {
  public:
    using Item = Expected<FileProviderItemPtr>;
    using Failure = std::optional<Error>;

    // Below `parent`.
    explicit ActionsWorld(const std::string& parent);

    // `recording`: none is that of a service.
    void open(native::StoreOptions::Recording recording = native::StoreOptions::Recording::live);
    // Sweeps what operations of a killed process left, as every start does.
    void openAfterKill();
    void close();

    [[nodiscard]] std::string root() const { return directory_.path("Documents"); }
    // Below the storage root.
    [[nodiscard]] std::string path(std::string_view below) const {
        return root() + "/" + std::string(below);
    }
    [[nodiscard]] std::string box(std::string_view name) const {
        return path("box/" + std::string(name));
    }
    [[nodiscard]] std::string outside(std::string_view name) const {
        return directory_.path("outside/" + std::string(name));
    }
    [[nodiscard]] const TemporaryDirectory& directory() const { return directory_; }
    [[nodiscard]] LocalFileProvider& provider() { return *provider_; }
    [[nodiscard]] TestWorld& world() { return *world_; }

    // Of what stands at a path below the root; "" where nothing does.
    [[nodiscard]] std::string identifierOf(std::string_view below);

    Item import(const std::string& source, const std::string& parent);
    Item create(const std::string& name, const std::string& parent);
    Item rename(const std::string& item, const std::string& name);
    Item move(const std::string& item, const std::string& parent,
              std::optional<std::string> name = std::nullopt);
    Item trash(const std::string& item);
    Item untrash(const std::string& item, std::optional<std::string> parent);
    Failure remove(const std::string& item);
    Item favorite(const std::string& item, std::uint64_t rank);

    // Each file below the storage root (a folder: its name with a "/" behind it) and its contents.
    [[nodiscard]] std::map<std::string, std::string> picture() const;
    // Hidden names but the trash, anywhere below the storage root, and notes of temporary folders.
    [[nodiscard]] std::set<std::string> leftOvers() const;

  private:
    TemporaryDirectory directory_;
    std::unique_ptr<TestWorld> world_;
    std::unique_ptr<LocalFileProvider> provider_;
};

// Of what an action answered: its error's, 0 where it has none.
[[nodiscard]] inline int codeOf(const ActionsWorld::Item& answer) {
    return answer ? 0 : answer.error().code;
}

}  // namespace marrowdale::tests
