#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "platform/hostframework/FileProviderExtension.h"
#include "platform/linux/store/Store.h"

namespace marrowdale::benchmarks {

// The extension over the real platform, in this process, without a log.
class World {
  public:
    // Reconciles the store, as every start does.
    World(const std::string& root, const std::string& state);
    // On a system with these applications, which outlive it.
    World(const std::string& root, const std::string& state, ApplicationRegistry& applications);
    // Over a store that records as a service does.
    World(const std::string& root, const std::string& state,
          native::StoreOptions::Recording recording);
    ~World();
    World(const World&) = delete;
    World& operator=(const World&) = delete;

    [[nodiscard]] native::Store& store();
    [[nodiscard]] const Platform& platform();
    [[nodiscard]] FileProviderExtension& provider();

  private:
    class Parts;
    std::unique_ptr<Parts> parts_;
};

// Removes a store, so that the next world begins with none.
void forgetState(const std::string& state);

// A store in its own folder, and how long it took to open but for the reconcile.
struct OpenedStore {
    std::unique_ptr<native::Store> store;
    std::chrono::duration<double> loading{};
};
[[nodiscard]] OpenedStore openStore(const std::string& root, const std::string& state);

// Follows the pages of a container to the end, and hands each on. Answers how many items there
// were. Throws where the provider answers an error.
using PageObserver = std::function<void(const std::vector<FileProviderItemPtr>&)>;
std::uint64_t listPages(World& world, std::string_view container, const PageObserver& observe = {});

// The container that holds all of a tree: the root for a flat one, all directories for others.
[[nodiscard]] std::string_view containerOf(bool isFlat);

}  // namespace marrowdale::benchmarks
