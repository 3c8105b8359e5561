#pragma once

#include <algorithm>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/files/LinuxExtendedAttributes.h"
#include "platform/linux/files/LinuxFileSystem.h"
#include "platform/linux/files/LinuxWriteAccess.h"
#include "platform/testing/FakeDocumentIndex.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {

// For tests of this folder: a fresh folder on the file system under test, and all services over it.
struct LinuxFilesWorld {
    explicit LinuxFilesWorld(const std::string& parent,
                             std::optional<AttributeCalls::Method> method = std::nullopt)
        : folder(parent), calls(method), trees({folder.path()}, {}) {}

    [[nodiscard]] std::string at(std::string_view name) const { return folder.path(name); }
    [[nodiscard]] URL url() const { return URL::fileURL(folder.path()); }
    [[nodiscard]] URL url(std::string_view name) const { return URL::fileURL(at(name)); }

    TemporaryDirectory folder;
    FakeDocumentIndex documents;
    MimeTypes types;
    PackageTypes packages;
    AttributeCache cache;
    AttributeCalls calls;
    SharedWork work;
    ServedTrees trees;
    LinuxFileSystem files{{documents, types, packages, cache, calls, trees, work}};
    LinuxExtendedAttributes attributes{calls, trees};
    LinuxWriteAccess writeAccess{trees};
};

// The same services over other trees than the world's own folder.
struct LinuxFilesServices {
    LinuxFilesServices(LinuxFilesWorld& world, const std::vector<std::string>& roots,
                       const std::vector<std::string>& privateFolders)
        : trees(roots, privateFolders),
          files({world.documents, world.types, world.packages, world.cache, world.calls, trees,
                 world.work}),
          attributes(world.calls, trees),
          writeAccess(trees) {}

    ServedTrees trees;
    LinuxFileSystem files;
    LinuxExtendedAttributes attributes;
    LinuxWriteAccess writeAccess;
};

// The base of tests that run on every file system.
class OnEachFileSystem : public testing::TestWithParam<TestFileSystem> {
  protected:
    LinuxFilesWorld world_{GetParam().dir};
};

inline constexpr ResourceKeySet everyKey{
    ResourceKey::name,       ResourceKey::localizedName,      ResourceKey::typeIdentifier,
    ResourceKey::fileSize,   ResourceKey::creationDate,       ResourceKey::contentModificationDate,
    ResourceKey::isReadable, ResourceKey::isWritable,         ResourceKey::fileID,
    ResourceKey::isPackage,  ResourceKey::documentIdentifier, ResourceKey::isDirectory,
};

}  // namespace marrowdale::native
