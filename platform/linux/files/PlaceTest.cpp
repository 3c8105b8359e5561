#include <cerrno>
#include <filesystem>
#include <string>
#include <vector>

#include "platform/linux/files/LinuxFilesTestWorld.h"
#include "platform/linux/files/Place.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

// What every service answers for an item by its path.
class PlaceTest : public OnEachFileSystem {
  protected:
    struct Answer {
        std::string service;
        bool isGood = false;
        Error error;
    };
    template <typename T>
    static Answer answer(const char* service, const Expected<T>& result) {
        return {service, result.has_value(), result ? Error() : result.error()};
    }
    static std::vector<Answer> ask(LinuxFilesServices& services, const URL& url) {
        std::vector<Answer> answers;
        for (const ResourceKey key :
             {ResourceKey::fileID, ResourceKey::isWritable, ResourceKey::documentIdentifier}) {
            answers.push_back(
                answer("value", services.files.resourceValue(URL::fileURL(url.path()), key)));
        }
        answers.push_back(answer("open", services.files.openForEvents(url)));
        answers.push_back(answer("status", services.files.status(url)));
        answers.push_back(answer("write", services.writeAccess.openForWriting(url)));
        answers.push_back(answer("list", services.files.enumerateDirectory({.url = url,
                                                                            .keys = {},
                                                                            .attributeNames = {},
                                                                            .options = {},
                                                                            .position = {},
                                                                            .errorHandler = {}})));
        answers.push_back(answer("attribute", services.attributes.size(url, "one")));
        return answers;
    }
    void expectMissing(LinuxFilesServices& services, const std::string& name) {
        for (const Answer& one : ask(services, world_.url(name))) {
            EXPECT_FALSE(one.isGood) << one.service << " " << name;
            const bool isValue = one.service == "value";
            EXPECT_EQ(one.error.domain, isValue ? ErrorDomain::file : ErrorDomain::posix)
                << one.service << " " << name;
            EXPECT_EQ(one.error.code, isValue ? 260 : ENOENT) << one.service << " " << name;
        }
    }
    // A folder: attributes aside, everything is answered.
    void expectFolder(LinuxFilesServices& services, const std::string& name) {
        for (const Answer& one : ask(services, world_.url(name))) {
            EXPECT_EQ(one.isGood, one.service != "attribute") << one.service << " " << name;
            if (one.service == "attribute") {
                EXPECT_NE(one.error.code, ENOENT) << name;
            }
        }
    }

    LinuxFilesServices services_{world_, {world_.folder.path()}, {}};
};
INSTANTIATE_TEST_SUITE_P(OnEach, PlaceTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(PlaceTest, foldersOfTheTreeAreThere) {
    makeFolder(world_.at("p/q"));
    expectFolder(services_, "p/q");
    expectFolder(services_, "p");
    expectFolder(services_, "p/../p/./q");
    for (const Answer& one : ask(services_, world_.url())) {
        EXPECT_EQ(one.isGood, one.service != "attribute") << one.service;
    }
}

TEST_P(PlaceTest, nothingIsBehindAFolderThatWasExchangedForALink) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("q/leak"));
    makeFolder(world_.at("p/q/leak"));
    expectFolder(services_, "p/q/leak");
    std::filesystem::rename(world_.at("p"), world_.at("old"));
    // Relative, so that nothing but the link itself is in the way.
    std::filesystem::create_directory_symlink(
        "../" + std::filesystem::path(outside.path()).filename().string(), world_.at("p"));
    expectMissing(services_, "p/q");
    expectMissing(services_, "p/q/leak");
    // The link itself is an item.
    EXPECT_TRUE(services_.files.openForEvents(world_.url("p")));
    EXPECT_FALSE(services_.files.createDirectory(world_.url("p/q/made")));
    EXPECT_FALSE(std::filesystem::exists(outside.path("q/made")));
}

TEST_P(PlaceTest, linksWithinTheTreeAreNoWayEither) {
    makeFolder(world_.at("real/q"));
    std::filesystem::create_directory_symlink("real", world_.at("link"));
    expectMissing(services_, "link/q");
}

TEST_P(PlaceTest, aPathThatLeavesTheTreeIsJudgedByWhereItLeads) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("x"));
    const std::string up = "../" + outside.path().substr(outside.path().rfind('/') + 1) + "/x";
    expectFolder(services_, up);
    // And one that comes in from outside by where it arrives.
    makeFolder(world_.at("p"));
    std::filesystem::create_directory_symlink(outside.path(), world_.at("link"));
    const std::string own = world_.folder.path().substr(world_.folder.path().rfind('/'));
    expectFolder(services_, ".." + own + "/p");
    expectMissing(services_, ".." + own + "/link/x");
}

TEST_P(PlaceTest, outsideTheTreesLinksAboveAnItemAreFollowed) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("real/q"));
    std::filesystem::create_directory_symlink("real", outside.path("link"));
    for (const Answer& one : ask(services_, URL::fileURL(outside.path("link/q")))) {
        EXPECT_EQ(one.isGood, one.service != "attribute") << one.service;
    }
}

TEST_P(PlaceTest, anotherFileSystemMountedBelowTheRootIsNotThere) {
    makeFolder(world_.at("p/mnt"));
    expectFolder(services_, "p/mnt");
    const ScopedMount mounted = ScopedMount::memory(world_.at("p/mnt"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.at("p/mnt/x/y"));
    expectMissing(services_, "p/mnt");
    expectMissing(services_, "p/mnt/x");
    expectMissing(services_, "p/mnt/x/y");
    EXPECT_FALSE(services_.files.createDirectory(world_.url("p/mnt/made")));
    EXPECT_FALSE(std::filesystem::exists(world_.at("p/mnt/made")));
    EXPECT_TRUE(world_.documents.told().empty());
}

TEST_P(PlaceTest, aFolderOrFileBoundToAnotherPlaceIsNotThere) {
    makeFolder(world_.at("real/x"));
    makeFolder(world_.at("bound"));
    writeFile(world_.at("file"), "1");
    writeFile(world_.at("boundFile"), "2");
    const ScopedMount folder = ScopedMount::bind(world_.at("real"), world_.at("bound"));
    const ScopedMount file = ScopedMount::bind(world_.at("file"), world_.at("boundFile"));
    if (!folder || !file) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    expectFolder(services_, "real/x");
    expectMissing(services_, "bound");
    expectMissing(services_, "bound/x");
    EXPECT_EQ(services_.files.status(world_.url("boundFile")).error().code, ENOENT);
    EXPECT_EQ(services_.files.openForEvents(world_.url("boundFile")).error().code, ENOENT);
    EXPECT_EQ(services_.writeAccess.openForWriting(world_.url("boundFile")).error().code, ENOENT);
    EXPECT_EQ(services_.attributes.size(world_.url("boundFile"), "one").error().code, ENOENT);
}

TEST_P(PlaceTest, aRootThatIsAMountItselfIsServed) {
    makeFolder(world_.at("mnt"));
    const ScopedMount mounted = ScopedMount::memory(world_.at("mnt"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.at("mnt/x/y"));
    LinuxFilesServices services(world_, {world_.at("mnt")}, {});
    EXPECT_TRUE(services.files.openForEvents(world_.url("mnt")));
    EXPECT_TRUE(services.files.openForEvents(world_.url("mnt/x")));
    EXPECT_TRUE(services.files.openForEvents(world_.url("mnt/x/y")));
    // What is mounted over it later is another tree.
    const ScopedMount over = ScopedMount::memory(world_.at("mnt"));
    EXPECT_EQ(services.files.openForEvents(world_.url("mnt")).error().code, ENOENT);
}

TEST_P(PlaceTest, privateFoldersAreNotThere) {
    makeFolder(world_.at("state/marrowdale/store"));
    makeFolder(world_.at("state/other"));
    LinuxFilesServices services(world_, {world_.folder.path()}, {world_.at("state/marrowdale")});
    expectFolder(services, "state");
    expectFolder(services, "state/other");
    expectMissing(services, "state/marrowdale");
    expectMissing(services, "state/marrowdale/store");
}

TEST_P(PlaceTest, nothingIsServedFromARootThatWasRenamedAway) {
    makeFolder(world_.at("root/x/y"));
    LinuxFilesServices services(world_, {world_.at("root")}, {});
    expectFolder(services, "root/x/y");
    std::filesystem::rename(world_.at("root"), world_.at("moved"));
    expectMissing(services, "root");
    expectMissing(services, "root/x");
    makeFolder(world_.at("root/x/y"));
    expectMissing(services, "root");
    expectMissing(services, "root/x/y");
    std::filesystem::remove_all(world_.at("root"));
    std::filesystem::rename(world_.at("moved"), world_.at("root"));
    expectFolder(services, "root/x/y");
}

}  // namespace
}  // namespace marrowdale::native
