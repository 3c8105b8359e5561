#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "platform/linux/files/AttributeCache.h"
#include "platform/linux/files/AttributeCalls.h"
#include "platform/linux/files/LinuxApplicationSupport.h"
#include "platform/linux/files/LinuxExtendedAttributes.h"
#include "platform/linux/files/LinuxFileSystem.h"
#include "platform/linux/files/LinuxWriteAccess.h"
#include "platform/linux/files/MimeTypes.h"
#include "platform/linux/files/PackageTypes.h"
#include "platform/linux/icons/LinuxIconService.h"
#include "platform/linux/icons/PNGEncoder.h"
#include "platform/linux/operations/LinuxFileOperations.h"
#include "platform/linux/store/Store.h"
#include "platform/linux/streams/LinuxFileEvents.h"
#include "platform/testing/FakeApplicationRegistry.h"
#include "platform/testing/FakeDeviceInformation.h"
#include "platform/testing/FakeManager.h"
#include "platform/testing/FaultInjectingFileOperations.h"
#include "platform/testing/FaultInjectingFileSystem.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale {

// A whole world on real folders: the storage root "Documents" in a temporary directory, the store's
// state in "state" beside it, the extension's own files in "data", the real file system and store
// over them; a host and an application registry that a test decides about, and a log that
// remembers. Where a fault can't be provoked, a test puts it into `fileSystem`.
//
// A second world on the same directory, after the first is gone, is what a new process finds.
class TestWorld {
  public:
    // What the store and the file services know: the storage root, or all of the directory, for app
    // libraries that lie in it beside the storage root.
    enum class Serving : std::uint8_t { storageRoot, wholeDirectory };

    // Makes the storage root when it is missing. `directory` lives longer. Throws
    // std::runtime_error where the store can't be opened. `storeOptions` say how it is opened, but
    // for where things lie and for the log, which are the world's.
    explicit TestWorld(const TemporaryDirectory& directory, native::StoreOptions storeOptions = {},
                       Serving serving = Serving::storageRoot);
    TestWorld(const TestWorld&) = delete;
    TestWorld& operator=(const TestWorld&) = delete;
    // Answers that are still to come use the rest.
    ~TestWorld() { realFileOperations_.finish(); }

    // The storage root's path, and that of something in it.
    [[nodiscard]] const std::string& root() const { return manager.documentStorageURL().path(); }
    [[nodiscard]] std::string path(std::string_view name) const {
        return root() + "/" + std::string(name);
    }
    [[nodiscard]] URL url(std::string_view name) const { return URL::fileURL(path(name)); }
    // An application whose library the extension knows; see addLibrary.
    std::shared_ptr<FakeBundleRecord> addLibrary(std::string identifier, std::string displayName,
                                                 std::string_view containerPath);

  private:
    const std::string rootPath_;
    const std::string servedPath_;
    native::MimeTypes types_;
    native::PackageTypes packages_;
    native::AttributeCache attributeCache_;
    native::AttributeCalls attributeCalls_;
    native::SharedWork sharedWork_;

  public:
    const std::shared_ptr<RecordingLogSink> sink = std::make_shared<RecordingLogSink>();
    Log log{sink, LogLevel::debug};
    const std::unique_ptr<native::Store> store;
    native::LinuxFileEvents fileEvents{*store};
    const native::ServedTrees trees;
    const std::unique_ptr<native::Temporaries> temporaries;
    native::LinuxFileSystem realFileSystem;
    FaultInjectingFileSystem fileSystem{realFileSystem};
    native::LinuxExtendedAttributes attributes{attributeCalls_, trees};
    native::LinuxWriteAccess writeAccess{trees};
    FakeApplicationRegistry applications;
    FakeManager manager;
    SharedObjects shared;
    native::LinuxApplicationSupport applicationSupport;
    FakeDeviceInformation device;
    native::LinuxIconService icons;
    native::PNGEncoder imageEncoder;

  private:
    native::LinuxFileOperations realFileOperations_{{.trees = trees,
                                                     .packages = packages_,
                                                     .temporaries = *temporaries,
                                                     .ownMoves = &store->ownMoves()},
                                                    &log};

  public:
    FaultInjectingFileOperations fileOperations{realFileOperations_};
    const Platform platform{
        log,        fileSystem,   attributes, writeAccess, fileOperations,     *store,
        fileEvents, applications, manager,    shared,      applicationSupport, device,
        icons,      imageEncoder};
};

}  // namespace marrowdale
