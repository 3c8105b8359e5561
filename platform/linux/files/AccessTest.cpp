#include <array>
#include <cstdint>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "platform/linux/files/Access.h"
#include "platform/linux/files/LinuxFilesTestWorld.h"

namespace marrowdale::native {
namespace {

Credentials user(std::uint32_t id, std::vector<std::uint32_t> groups) {
    return {.user = id,
            .groups = std::move(groups),
            .overridesAccess = false,
            .overridesReading = false};
}

EntryStatus fileOf(std::uint32_t owner, std::uint32_t group, std::uint32_t bits) {
    EntryStatus status;
    status.mode = S_IFREG | bits;
    status.owner = owner;
    status.group = group;
    return status;
}

constexpr Access none{false, false};
constexpr Access readOnly{true, false};
constexpr Access writeOnly{false, true};
constexpr Access both{true, true};

TEST(AccessTest, theFirstClassThatFitsDecides) {
    const Credentials owner = user(1, {10});
    const Credentials member = user(2, {20, 10});
    const Credentials other = user(3, {30});
    const EntryStatus file = fileOf(1, 10, 0426);
    EXPECT_EQ(computeAccess(file, owner, Mount::writable), readOnly);
    EXPECT_EQ(computeAccess(file, member, Mount::writable), writeOnly);
    EXPECT_EQ(computeAccess(file, other, Mount::writable), both);
    // An owner without rights gets none from "others".
    EXPECT_EQ(computeAccess(fileOf(1, 10, 0077), owner, Mount::writable), none);
}

TEST(AccessTest, privilegeOverridesBitsAndNothingElse) {
    Credentials root = user(0, {0});
    root.overridesAccess = root.overridesReading = true;
    EntryStatus file = fileOf(1, 1, 0);
    EXPECT_EQ(computeAccess(file, root, Mount::writable), both);
    EXPECT_EQ(computeAccess(file, root, Mount::readOnly), readOnly);
    file.isImmutable = true;
    EXPECT_EQ(computeAccess(file, root, Mount::writable), readOnly);
    Credentials reader = user(5, {5});
    reader.overridesReading = true;
    EXPECT_EQ(computeAccess(fileOf(1, 1, 0), reader, Mount::writable), readOnly);
}

TEST(AccessTest, linksAreOpenToAllAndDependOnNoList) {
    EntryStatus link = fileOf(1, 1, 0);
    link.mode = S_IFLNK;
    EXPECT_EQ(computeAccess(link, user(2, {2}), Mount::writable), both);
    EXPECT_FALSE(dependsOnAccessList(link, user(2, {2})));
}

TEST(AccessTest, listsMatterToThoseWhoAreNeitherOwnerNorPrivileged) {
    EXPECT_FALSE(dependsOnAccessList(fileOf(1, 1, 0600), user(1, {1})));
    EXPECT_TRUE(dependsOnAccessList(fileOf(1, 1, 0600), user(2, {1})));
    Credentials root = user(0, {0});
    root.overridesAccess = true;
    EXPECT_FALSE(dependsOnAccessList(fileOf(1, 1, 0600), root));
    // As seen from a user namespace, a file of nobody it knows.
    EXPECT_TRUE(dependsOnAccessList(fileOf(65534, 65534, 0600), root));
}

class AccessOfFilesTest : public OnEachFileSystem {};
INSTANTIATE_TEST_SUITE_P(OnEach, AccessOfFilesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(AccessOfFilesTest, computedIsWhatTheKernelSays) {
    const Credentials credentials = Credentials::ofThisProcess();
    const std::string path = world_.at("file");
    writeFile(path, "");
    for (unsigned mode = 0; mode <= 0777; mode += 0111) {
        ASSERT_EQ(::chmod(path.c_str(), mode), 0);
        const auto status = statEntry(AT_FDCWD, path.c_str());
        EXPECT_EQ(computeAccess(*status, credentials, Mount::writable),
                  askAccess(AT_FDCWD, path.c_str()))
            << std::oct << mode;
    }
}

// A list that lets user 65533 write a file whose bits let only the owner.
bool grantByList(const std::string& path, std::uint32_t grantee) {
    struct Entry {
        std::uint16_t tag, permissions;
        std::uint32_t id;
    };
    constexpr std::uint32_t nobody = 0xFFFFFFFFU;
    const std::array<Entry, 5> entries{
        {{1, 6, nobody}, {2, 6, grantee}, {4, 0, nobody}, {16, 6, nobody}, {32, 0, nobody}}};
    std::array<std::uint8_t, 4 + sizeof entries> bytes{2, 0, 0, 0};
    std::memcpy(bytes.data() + 4, entries.data(), sizeof entries);
    return ::setxattr(path.c_str(), "system.posix_acl_access", bytes.data(), bytes.size(), 0) == 0;
}

TEST_P(AccessOfFilesTest, listsAreAskedOfTheKernel) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root can act as two users");
    }
    constexpr uid_t grantee = 65533;
    const std::string path = world_.at("granted");
    writeFile(path, "");
    writeFile(world_.at("refused"), "");
    ASSERT_EQ(::chmod(path.c_str(), 0600), 0);
    ASSERT_EQ(::chmod(world_.at("refused").c_str(), 0600), 0);
    ASSERT_EQ(::chmod(world_.folder.path().c_str(), 0755), 0);
    if (!grantByList(path, grantee)) {
        MARROWDALE_SKIP("the file system keeps no access lists");
    }
    // As that user, in effect; the capabilities go with the effective user.
    ASSERT_EQ(::seteuid(grantee), 0);
    LinuxFileSystem files({world_.documents, world_.types, world_.packages, world_.cache,
                           world_.calls, world_.trees, world_.work, Credentials::ofThisProcess()});
    DirectoryEnumerationRequest request{.url = world_.url(),
                                        .keys = everyKey,
                                        .attributeNames = {},
                                        .options = {},
                                        .position = {},
                                        .errorHandler = {}};
    std::vector<URL> urls;
    const auto walk = files.enumerateDirectory(request);
    const bool listed = walk && (*walk)->next(10, urls).has_value();
    const auto single = files.resourceValue(world_.url("granted"), ResourceKey::isWritable);
    const auto refused = files.resourceValue(world_.url("refused"), ResourceKey::isReadable);
    ASSERT_EQ(::seteuid(0), 0);
    if (!listed) {
        MARROWDALE_SKIP("the folder under test can't be reached by another user");
    }
    ASSERT_EQ(urls.size(), 2U);
    for (const URL& url : urls) {
        const bool granted = url.lastPathComponent() == "granted";
        EXPECT_EQ(url.prefetched()->isReadable, granted);
        EXPECT_EQ(url.prefetched()->isWritable, granted);
    }
    EXPECT_EQ(*single, ResourceValue(true));
    EXPECT_EQ(*refused, ResourceValue(false));
}

}  // namespace
}  // namespace marrowdale::native
