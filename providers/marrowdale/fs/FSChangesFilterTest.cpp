#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/fs/FSChangesFilter.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"

namespace marrowdale {
namespace {

constexpr std::string_view workingSet = VantrelWorkingSetContainerItemIdentifier;
constexpr std::string_view root = VantrelRootContainerItemIdentifier;
constexpr std::string_view allDirectories = VantrelAllDirectoriesContainerItemIdentifier;

template <typename Item = LocalItem>
Item itemOf(std::string_view identifier, std::string_view parent, std::string_view type) {
    Item item(URL::fileURL("/storage/item"));
    item.itemIdentifier = identifier;
    item.parentItemIdentifier = parent;
    item.typeIdentifier = type;
    return item;
}

const LocalItem file = itemOf("did=1", root, "text/plain");
const LocalItem folder = itemOf("fid=2", root, "inode/directory");
const LocalItem package = itemOf("did=3", root, "application/x-package");
const LocalItem deeper = itemOf("did=4", "fid=2", "text/plain");
const LocalItem library = itemOf("#org.example", root, "inode/directory");
const LocalItem rootItem = itemOf(root, root, "inode/directory");

TEST(FSChangesFilterTest, theWorkingSetIsToldEverythingButLibraries) {
    for (const auto& item : {file, folder, package, deeper}) {
        EXPECT_EQ(reasonToIgnoreUpdate(workingSet, item), "");
    }
    EXPECT_EQ(reasonToIgnoreUpdate(workingSet, library), "; app library are not indexed");
}

TEST(FSChangesFilterTest, aLibraryIsOneByItsRecordToo) {
    const auto record = itemOf<LocalAppLibraryItem>("fid=9", root, "inode/directory");
    EXPECT_EQ(reasonToIgnoreUpdate(workingSet, record), "; app library are not indexed");
    EXPECT_EQ(reasonToIgnoreUpdate(allDirectories, record), "; app library are not indexed");
}

TEST(FSChangesFilterTest, allDirectoriesAreToldFolders) {
    EXPECT_EQ(reasonToIgnoreUpdate(allDirectories, folder), "");
    for (const auto& item : {file, package, deeper}) {
        EXPECT_EQ(reasonToIgnoreUpdate(allDirectories, item), "; item is not a directory");
    }
}

TEST(FSChangesFilterTest, aFolderIsToldItsChildren) {
    EXPECT_EQ(reasonToIgnoreUpdate(root, file), "");
    EXPECT_EQ(reasonToIgnoreUpdate(root, folder), "");
    EXPECT_EQ(reasonToIgnoreUpdate(root, deeper),
              "; item is not a directory of " + std::string(root));
    EXPECT_EQ(reasonToIgnoreUpdate("fid=2", deeper), "");
    EXPECT_EQ(reasonToIgnoreUpdate("fid=2", file), "; item is not a directory of fid=2");
}

TEST(FSChangesFilterTest, theRootIsNotAChildOfItself) {
    EXPECT_EQ(reasonToIgnoreUpdate(root, rootItem),
              "; item is not a directory of " + std::string(root));
}

TEST(FSChangesFilterTest, deletionsAreToldWhereTheyMayConcern) {
    using enum DeletionRoute;
    EXPECT_EQ(routeOfDeletion(workingSet, "#org.example"), ignoredAsLibrary);
    EXPECT_EQ(routeOfDeletion(workingSet, "did=1"), forwarded);
    EXPECT_EQ(routeOfDeletion(workingSet, "fid=1"), forwarded);
    EXPECT_EQ(routeOfDeletion(allDirectories, "#org.example"), ignoredAsNoDirectory);
    EXPECT_EQ(routeOfDeletion(allDirectories, "did=1"), ignoredAsNoDirectory);
    EXPECT_EQ(routeOfDeletion(allDirectories, "fid=1"), forwarded);
    EXPECT_EQ(routeOfDeletion(root, "#org.example"), leftToTheRoot);
    EXPECT_EQ(routeOfDeletion(root, "did=1"), forwarded);
    EXPECT_EQ(routeOfDeletion("fid=2", "#org.example"), forwarded);
    EXPECT_EQ(routeOfDeletion("fid=2", "did=1"), forwarded);
}

}  // namespace
}  // namespace marrowdale
