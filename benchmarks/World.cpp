#include "benchmarks/World.h"

#include <filesystem>
#include <optional>
#include <stdexcept>
#include <utility>

#include "benchmarks/Measurement.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/linux/applications/NoApplications.h"
#include "platform/linux/files/LinuxApplicationSupport.h"
#include "platform/linux/files/LinuxExtendedAttributes.h"
#include "platform/linux/files/LinuxFileSystem.h"
#include "platform/linux/files/LinuxWriteAccess.h"
#include "platform/linux/icons/LinuxDeviceInformation.h"
#include "platform/linux/icons/LinuxIconService.h"
#include "platform/linux/icons/PNGEncoder.h"
#include "platform/linux/operations/LinuxFileOperations.h"
#include "platform/linux/streams/LinuxFileEvents.h"
#include "providers/marrowdale/LocalFileProvider.h"

namespace marrowdale::benchmarks {
namespace {

class Manager : public FileProviderManager {
  public:
    explicit Manager(URL root) : root_(std::move(root)) {}
    const URL& documentStorageURL() const override { return root_; }
    void signalEnumeratorForContainerItemIdentifier(
        std::string_view /*containerItemIdentifier*/,
        std::function<void(const std::optional<Error>&)> completionHandler) override {
        if (completionHandler) {
            completionHandler(std::nullopt);
        }
    }

    void deleteIndexedItemsInDomains(
        std::vector<std::string> /*domainIdentifiers*/,
        std::function<void(const std::optional<Error>&)> completionHandler) override {
        if (completionHandler) {
            completionHandler(std::nullopt);
        }
    }

  private:
    URL root_;
};

// Keeps one page.
class PageKeeper : public FileProviderEnumerationObserver {
  public:
    void didEnumerateItems(std::vector<FileProviderItemPtr> items) override {
        items_.insert(items_.end(), items.begin(), items.end());
    }
    void finishEnumeratingUpToPage(std::optional<Data> nextPage) override {
        nextPage_ = std::move(nextPage);
    }
    void finishEnumeratingWithError(const Error& error) override { error_ = error; }
    // Throws what the provider answered.
    void check() const {
        if (error_) {
            throw std::runtime_error(error_->description());
        }
    }
    [[nodiscard]] const std::vector<FileProviderItemPtr>& items() const { return items_; }
    [[nodiscard]] const std::optional<Data>& nextPage() const { return nextPage_; }

  private:
    std::vector<FileProviderItemPtr> items_;
    std::optional<Data> nextPage_;
    std::optional<Error> error_;
};

native::StoreOptions storeOptions(const std::string& root, const std::string& state) {
    return {.stateFolder = state,
            .cacheFolder = state + "/cache",
            .rootPath = root,
            .lockWait = std::chrono::milliseconds(0),
            .log = nullptr};
}

using Recording = native::StoreOptions::Recording;

std::unique_ptr<native::Store> openedStore(const std::string& root, const std::string& state,
                                           Recording recording = Recording::once) {
    auto options = storeOptions(root, state);
    options.recording = recording;
    auto store = native::Store::open(options);
    if (!store) {
        throw std::runtime_error(store.error().description());
    }
    return std::move(*store);
}

std::unique_ptr<native::Temporaries> openedTemporaries(const std::string& state) {
    auto temporaries = native::Temporaries::open(state, nullptr);
    if (!temporaries) {
        throw std::runtime_error(temporaries.error().description());
    }
    return std::move(*temporaries);
}

}  // namespace

class World::Parts {
  public:
    Parts(const std::string& root, const std::string& state, ApplicationRegistry* registry,
          Recording recording = Recording::once)
        : applications(registry ? *registry : noApplications),
          store(openedStore(root, state, recording)),
          trees({root}, {state, state + "/cache"}),
          temporaries(openedTemporaries(state)),
          manager(URL::fileURL(root)),
          applicationSupport(state + "/data") {}

    native::NoApplications noApplications;
    ApplicationRegistry& applications;
    std::unique_ptr<native::Store> store;
    native::LinuxFileEvents fileEvents{*store};
    native::ServedTrees trees;
    Log log{nullptr, LogLevel::error};
    native::MimeTypes types;
    native::PackageTypes packages;
    native::AttributeCache attributeCache;
    native::AttributeCalls attributeCalls;
    native::SharedWork sharedWork;
    native::LinuxFileSystem fileSystem{native::FileSources{.documents = *store,
                                                           .types = types,
                                                           .packages = packages,
                                                           .attributes = attributeCache,
                                                           .calls = attributeCalls,
                                                           .trees = trees,
                                                           .work = sharedWork}};
    native::LinuxExtendedAttributes extendedAttributes{attributeCalls, trees};
    native::LinuxWriteAccess writeAccess{trees};
    std::unique_ptr<native::Temporaries> temporaries;
    native::LinuxFileOperations fileOperations{{.trees = trees,
                                                .packages = packages,
                                                .temporaries = *temporaries,
                                                .ownMoves = &store->ownMoves()},
                                               &log};
    Manager manager;
    SharedObjects shared;
    native::LinuxApplicationSupport applicationSupport;
    native::LinuxDeviceInformation deviceInformation{[](std::string_view) { return std::nullopt; }};
    native::LinuxIconService icons;
    native::PNGEncoder imageEncoder;
    Platform platform{.log = log,
                      .fileSystem = fileSystem,
                      .extendedAttributes = extendedAttributes,
                      .writeAccess = writeAccess,
                      .fileOperations = fileOperations,
                      .generationStore = *store,
                      .fileEvents = fileEvents,
                      .applications = applications,
                      .manager = manager,
                      .shared = shared,
                      .applicationSupport = applicationSupport,
                      .deviceInformation = deviceInformation,
                      .icons = icons,
                      .imageEncoder = imageEncoder};
    LocalFileProvider provider{platform};
};

World::World(const std::string& root, const std::string& state)
    : parts_(std::make_unique<Parts>(root, state, nullptr)) {}
World::World(const std::string& root, const std::string& state, ApplicationRegistry& applications)
    : parts_(std::make_unique<Parts>(root, state, &applications)) {}
World::World(const std::string& root, const std::string& state, Recording recording)
    : parts_(std::make_unique<Parts>(root, state, nullptr, recording)) {}
World::~World() = default;

native::Store& World::store() {
    return *parts_->store;
}
const Platform& World::platform() {
    return parts_->platform;
}
FileProviderExtension& World::provider() {
    return parts_->provider;
}

void forgetState(const std::string& state) {
    std::filesystem::remove_all(state);
}

OpenedStore openStore(const std::string& root, const std::string& state) {
    OpenedStore opened;
    const Duration whole = timed([&] { opened.store = openedStore(root, state); });
    opened.loading = whole - opened.store->report().reconcile.duration;
    return opened;
}

std::uint64_t listPages(World& world, std::string_view container, const PageObserver& observe) {
    const auto enumerator = world.provider().enumeratorForContainerItemIdentifier(container);
    if (!enumerator) {
        throw std::runtime_error(enumerator.error().description());
    }
    std::uint64_t count = 0;
    std::optional<Data> page = VantrelInitialPageSortedByName();
    while (page) {
        PageKeeper keeper;
        (*enumerator)->enumerateItemsForObserver(keeper, *page);
        keeper.check();
        count += keeper.items().size();
        if (observe) {
            observe(keeper.items());
        }
        page = keeper.nextPage();
    }
    (*enumerator)->invalidate();
    return count;
}

std::string_view containerOf(bool isFlat) {
    return isFlat ? VantrelRootContainerItemIdentifier
                  : VantrelAllDirectoriesContainerItemIdentifier;
}

}  // namespace marrowdale::benchmarks
