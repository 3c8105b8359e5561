#include "host/daemon/World.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <string_view>
#include <utility>

#include "host/daemon/Applications.h"
#include "host/daemon/Doctor.h"
#include "host/daemon/ExtensionModule.h"
#include "host/daemon/HostManager.h"
#include "host/daemon/LibraryChanges.h"
#include "host/daemon/LibraryWitness.h"
#include "host/daemon/MarkedFileEvents.h"
#include "host/daemon/Mounts.h"
#include "host/daemon/ServedLibraries.h"
#include "host/daemon/TrashWatch.h"
#include "platform/Platform.h"
#include "platform/linux/files/LinuxApplicationSupport.h"
#include "platform/linux/files/LinuxExtendedAttributes.h"
#include "platform/linux/files/LinuxFileSystem.h"
#include "platform/linux/files/LinuxWriteAccess.h"
#include "platform/linux/icons/LinuxDeviceInformation.h"
#include "platform/linux/icons/LinuxIconService.h"
#include "platform/linux/icons/PNGEncoder.h"
#include "platform/linux/operations/LinuxFileOperations.h"
#include "platform/linux/store/Store.h"
#include "platform/linux/streams/LinuxFileEvents.h"

namespace marrowdale::host {

namespace {

// The extension needs one, whether or not the user has a home.
std::string dataFolder(const Settings& settings) {
    return settings.dataHome.empty() ? settings.stateFolder + "/data" : settings.dataHome;
}

}  // namespace

// The applications, and what sees to it that their documents are recorded and served. Made before
// the store, which is opened with the folders that are there.
struct World::ApplicationSide {
    ApplicationSide(const WorldOptions& options, Log& log)
        : libraryChanges(options.settings.stateFolder, dataFolder(options.settings), &log),
          libraries(options.settings.rootPath),
          applications(
              {.storageRoot = options.settings.rootPath,
               .cacheFolder = options.settings.cacheFolder,
               .iconProgramPath = options.iconProgramPath,
               .variable = options.variable,
               .log = &log,
               .documentFoldersChanged =
                   [this](const std::vector<std::string>& paths) { libraries.set(paths); }}),
          foldersAtStart(applications.registry().documentFolders()),
          packageExtensions(applications.registry().knownPackageExtensions()),
          packages(packageExtensions) {}

    LibraryChanges libraryChanges;
    ServedLibraries libraries;
    Applications applications;
    const std::vector<std::string> foldersAtStart;
    // As applications had it at the start: what is a folder and what a document stays for a run.
    const std::vector<std::string> packageExtensions;
    const native::PackageTypes packages;
};

// Members in the order in which they need each other; they go in the reverse order.
class World::Parts {
  public:
    Parts(WorldOptions options, std::unique_ptr<Log> log,
          std::unique_ptr<ApplicationSide> applicationSide, std::unique_ptr<native::Store> store,
          std::unique_ptr<native::Temporaries> temporaries)
        : options_(std::move(options)),
          log_(std::move(log)),
          applicationSide_(std::move(applicationSide)),
          applications_(applicationSide_->applications),
          store_(std::move(store)),
          temporaries_(std::move(temporaries)),
          fileEvents_(*store_, log_.get()),
          libraryWitness_(options_.settings.stateFolder, dataFolder(options_.settings),
                          applicationSide_->packageExtensions, log_.get()),
          trees_(applicationSide_->libraries.rootsWith(applicationSide_->foldersAtStart),
                 {options_.settings.stateFolder, options_.settings.cacheFolder}),
          fileSystem_({.documents = *store_,
                       .types = types_,
                       .packages = applicationSide_->packages,
                       .attributes = attributeCache_,
                       .calls = attributeCalls_,
                       .trees = trees_,
                       .work = sharedWork_}),
          extendedAttributes_(attributeCalls_, trees_),
          writeAccess_(trees_),
          fileOperations_({.trees = trees_,
                           .packages = applicationSide_->packages,
                           .temporaries = *temporaries_,
                           .ownMoves = &store_->ownMoves()},
                          log_.get()),
          manager_(options_.settings.rootPath),
          applicationSupport_(dataFolder(options_.settings)),
          deviceInformation_(options_.variable),
          platform_{.log = *log_,
                    .fileSystem = fileSystem_,
                    .extendedAttributes = extendedAttributes_,
                    .writeAccess = writeAccess_,
                    .fileOperations = fileOperations_,
                    .generationStore = *store_,
                    .fileEvents = markedFileEvents_,
                    .applications = applications_.registry(),
                    .manager = manager_,
                    .shared = shared_,
                    .applicationSupport = applicationSupport_,
                    .deviceInformation = deviceInformation_,
                    .icons = icons_,
                    .imageEncoder = imageEncoder_} {
        applicationSide_->libraries.attach(*store_, trees_, applicationSide_->foldersAtStart, *log_,
                                           &applicationSide_->libraryChanges);
    }

    ~Parts() {
        applications_.stopWatching();
        manager_.setIndexCleaner(nullptr);
        // Handlers refer to the extension.
        fileOperations_.finish();
        manager_.finishHandlers();
        requests_.reset();
        extension_.reset();
    }
    Parts(const Parts&) = delete;
    Parts& operator=(const Parts&) = delete;

    [[nodiscard]] Started<void> loadExtension() {
        auto module = ExtensionModule::load(options_.modulePath);
        if (!module) {
            return std::unexpected(std::move(module.error()));
        }
        module_ = std::move(*module);
        auto extension = module_->makeExtension(platform_);
        if (!extension) {
            return std::unexpected(std::move(extension.error()));
        }
        extension_ = std::move(*extension);
        requests_.emplace(LocalServices{
            .extension = *extension_,
            .signals = manager_.signals(),
            .rootPath = options_.settings.rootPath,
            .replicaPath = options_.settings.stateFolder + "/replica.sqlite",
            .stateFolder = options_.settings.stateFolder,
            .findings = [this] { return findings(); },
            .forgetApplications = [this] { applications_.forgetIcons(); },
            .librariesAreKnown =
                [this] {
                    libraryWitness_.lookAgain();
                    applicationSide_->libraryChanges.listIsKnown();
                },
            .libraryChanges = &applicationSide_->libraryChanges,
            .watchTrashes =
                [this] {
                    return std::make_unique<TrashWatch>(fileEvents_, manager_.signals(), *log_,
                                                        applicationSide_->libraries.roots());
                }});
        manager_.setIndexCleaner([this](std::vector<std::string> domains) {
            requests_->replica().removeDomains(std::move(domains));
        });
        if (options_.recording == native::StoreOptions::Recording::live) {
            applications_.watch([this] { requests_->applicationsChanged(); });
        }
        return {};
    }

    [[nodiscard]] LocalRequests& requests() { return *requests_; }
    [[nodiscard]] const Settings& settings() const { return options_.settings; }
    [[nodiscard]] Log& log() { return *log_; }

  private:
    [[nodiscard]] std::vector<Finding> findings() {
        const native::StoreReport report = store_->report();
        const std::string& root = options_.settings.rootPath;
        std::vector<Finding> findings =
            listeningFindings(report.recorder.isLive ? report.recorder : triedRecorder(root),
                              report.reconcile.folders);
        std::vector<std::string> mounts = mountsBelow(root);
        for (const auto& library : report.libraries) {
            std::ranges::move(mountsBelow(library.path), std::back_inserter(mounts));
        }
        std::ranges::move(storeFindings(report, mounts), std::back_inserter(findings));
        std::ranges::move(historyFindings(report, options_.retention),
                          std::back_inserter(findings));
        std::ranges::move(applications_.findings(), std::back_inserter(findings));
        return findings;
    }

    WorldOptions options_;
    // Goes last: caches below keep what the extension derived from attributes, and to let go of
    // that takes its code.
    std::unique_ptr<ExtensionModule> module_;
    std::unique_ptr<Log> log_;
    std::unique_ptr<ApplicationSide> applicationSide_;
    Applications& applications_;
    std::unique_ptr<native::Store> store_;
    std::unique_ptr<native::Temporaries> temporaries_;
    native::LinuxFileEvents fileEvents_;
    LibraryWitness libraryWitness_;
    MarkedFileEvents markedFileEvents_{fileEvents_, libraryWitness_};
    native::ServedTrees trees_;  // after the store, which makes the folders that are kept out
    native::MimeTypes types_;
    native::AttributeCache attributeCache_;
    native::AttributeCalls attributeCalls_;
    native::SharedWork sharedWork_;
    native::LinuxFileSystem fileSystem_;
    native::LinuxExtendedAttributes extendedAttributes_;
    native::LinuxWriteAccess writeAccess_;
    native::LinuxFileOperations fileOperations_;
    HostManager manager_;
    native::LinuxApplicationSupport applicationSupport_;
    native::LinuxDeviceInformation deviceInformation_;
    native::LinuxIconService icons_;
    native::PNGEncoder imageEncoder_;
    // Holds objects of the extension's, whose code is in the module.
    SharedObjects shared_;
    Platform platform_;
    std::unique_ptr<FileProviderExtension> extension_;
    std::optional<LocalRequests> requests_;
};

World::World(std::unique_ptr<Parts> parts) : parts_(std::move(parts)) {}

World::~World() = default;

namespace {

bool isHeldByAnother(const Error& error) {
    return error.domain == ErrorDomain::posix && error.code == EWOULDBLOCK;
}

// "process 12"; the store's error tells the number where there is one.
std::string holder(const Error& error) {
    const std::string_view subject = error.subject;
    constexpr std::string_view words = "process ";
    const auto at = subject.rfind(words);
    const auto number = at == std::string_view::npos ? "" : subject.substr(at + words.size());
    const auto digits = number.substr(0, number.find_first_not_of("0123456789"));
    return digits.empty() ? "another process" : std::string(words) + std::string(digits);
}

Expected<std::unique_ptr<native::Store>> openStore(const WorldOptions& options,
                                                   std::vector<native::LibraryFolder> libraries,
                                                   const native::PackageTypes& packages, Log& log) {
    native::StoreOptions store{.stateFolder = options.settings.stateFolder,
                               .cacheFolder = options.settings.cacheFolder,
                               .rootPath = options.settings.rootPath,
                               .libraries = std::move(libraries),
                               .lockWait = std::min(options.quietWait, options.lockWait),
                               .isServed = options.isServed,
                               .log = &log,
                               .recording = options.recording,
                               .packages = &packages,
                               .retention = options.retention};
    auto opened = native::Store::open(store);
    if (opened || !isHeldByAnother(opened.error()) || options.quietWait >= options.lockWait) {
        return opened;
    }
    if (options.tellWaiting) {
        options.tellWaiting("waiting for " + holder(opened.error()) +
                            ", which has the state folder");
    }
    store.lockWait = options.lockWait - options.quietWait;
    return native::Store::open(store);
}

StartFailure openingFailed(Error error, const Settings& settings) {
    if (!isHeldByAnother(error)) {
        return StartFailure::from(std::move(error));
    }
    std::string message = holder(error) + " has the state folder " + settings.stateFolder +
                          "; try again when it has ended";
    return {std::move(error), std::move(message)};
}

}  // namespace

Started<std::unique_ptr<World>> World::open(const WorldOptions& options) {
    auto log = std::make_unique<Log>(options.logSink, options.logThreshold);
    auto applicationSide = std::make_unique<ApplicationSide>(options, *log);
    auto store = openStore(options, ServedLibraries::foldersAt(applicationSide->foldersAtStart),
                           applicationSide->packages, *log);
    if (!store) {
        return std::unexpected(openingFailed(std::move(store.error()), options.settings));
    }
    auto temporaries = native::Temporaries::open(options.settings.stateFolder, log.get());
    if (!temporaries) {
        return std::unexpected(StartFailure::from(std::move(temporaries.error())));
    }
    (*temporaries)->sweep([&](FileID folder) {
        return (*store)->pathForFileID((*store)->device(), folder);
    });
    auto parts = std::make_unique<Parts>(options, std::move(log), std::move(applicationSide),
                                         std::move(*store), std::move(*temporaries));
    if (auto loaded = parts->loadExtension(); !loaded) {
        return std::unexpected(std::move(loaded.error()));
    }
    return std::unique_ptr<World>(new World(std::move(parts)));
}

LocalRequests& World::requests() const {
    return parts_->requests();
}

Log& World::log() const {
    return parts_->log();
}

const Settings& World::settings() const {
    return parts_->settings();
}

}  // namespace marrowdale::host
