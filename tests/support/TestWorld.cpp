#include "tests/support/TestWorld.h"

#include <stdexcept>
#include <utility>

#include "platform/testing/TestFiles.h"
#include "tests/support/AddedLibraries.h"

namespace marrowdale {

namespace {

std::string madeRoot(const TemporaryDirectory& directory) {
    std::string root = directory.path("Documents");
    makeFolder(root);
    return root;
}

std::unique_ptr<native::Store> openedStore(const TemporaryDirectory& directory,
                                           const std::string& rootPath, Log& log,
                                           native::StoreOptions options) {
    options.stateFolder = directory.path("state");
    options.cacheFolder = directory.path("cache");
    options.rootPath = rootPath;
    options.log = &log;
    auto store = native::Store::open(options);
    if (!store) {
        throw std::runtime_error(store.error().description());
    }
    return std::move(*store);
}

std::unique_ptr<native::Temporaries> openedTemporaries(const TemporaryDirectory& directory,
                                                       Log& log) {
    auto temporaries = native::Temporaries::open(directory.path("state"), &log);
    if (!temporaries) {
        throw std::runtime_error(temporaries.error().description());
    }
    return std::move(*temporaries);
}

}  // namespace

TestWorld::TestWorld(const TemporaryDirectory& directory, native::StoreOptions storeOptions,
                     Serving serving)
    : rootPath_(madeRoot(directory)),
      servedPath_(serving == Serving::storageRoot ? rootPath_ : directory.path()),
      store(openedStore(directory, servedPath_, log, std::move(storeOptions))),
      trees({servedPath_, rootPath_}, {directory.path("state"), directory.path("cache")}),
      temporaries(openedTemporaries(directory, log)),
      realFileSystem(native::FileSources{.documents = *store,
                                         .types = types_,
                                         .packages = packages_,
                                         .attributes = attributeCache_,
                                         .calls = attributeCalls_,
                                         .trees = trees,
                                         .work = sharedWork_}),
      manager(rootPath_),
      applicationSupport(directory.path("data")) {}

std::shared_ptr<FakeBundleRecord> TestWorld::addLibrary(std::string identifier,
                                                        std::string displayName,
                                                        std::string_view containerPath) {
    return marrowdale::addLibrary(platform, applications, std::move(identifier),
                                  std::move(displayName), containerPath);
}

}  // namespace marrowdale
