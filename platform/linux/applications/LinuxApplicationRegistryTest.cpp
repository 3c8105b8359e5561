#include <array>
#include <filesystem>
#include <sys/stat.h>

#include "platform/linux/applications/ApplicationTestWorld.h"
#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;

using enum ApplicationKind;

class LinuxApplicationRegistryTest : public ApplicationTestWorld {
  protected:
    std::optional<std::string> containerOf(std::string_view identifier) {
        const auto record = registry_.bundleRecordForIdentifier(identifier);
        const auto url = record ? record->dataContainerURL() : std::nullopt;
        return url ? std::optional(url->path()) : std::nullopt;
    }
    std::string nameOf(std::string_view identifier) {
        const auto record = registry_.bundleRecordForIdentifier(identifier);
        return record ? record->localizedName().value_or("none") : "no record";
    }
    std::optional<PropertyListDictionary> info(const BundleRecord& record) {
        constexpr std::array<std::string_view, 1> keys = {"KvSupportsDocumentBrowser"};
        return registry_.infoValuesForKeys(record, keys);
    }

    LinuxApplicationRegistry registry_{options("de_DE.UTF-8")};
};

TEST_F(LinuxApplicationRegistryTest, applicationsComeByKindInTheOrderOfTheirIdentifiers) {
    for (const char* name : {"org.example.B", "org.example.A"}) {
        writeFile(userEntry(name), entry(name));
        writeFile(systemEntry(std::string(name) + "S"), entry(name));
    }
    writeFile(home(".local/share/applications/notes.txt"), entry("no entry"));
    makeFolder(home(".local/share/applications/sub/deep"));
    writeFile(home(".local/share/applications/sub/deep/org.example.C.desktop"), entry("C"));
    EXPECT_EQ(identifiers(registry_, user),
              (Names{"org.example.A", "org.example.B", "sub-deep-org.example.C"}));
    EXPECT_EQ(identifiers(registry_, system), (Names{"org.example.AS", "org.example.BS"}));
    EXPECT_EQ(nameOf("sub-deep-org.example.C"), "C");
}

TEST_F(LinuxApplicationRegistryTest, applicationsMayGoWhileTheyAreGoneThrough) {
    for (int i = 0; i < 100; ++i) {
        writeFile(userEntry("org.example.A" + std::to_string(100 + i)), entry("A"));
    }
    Names seen;
    registry_.enumerateApplications(user, [&](const auto& record) {
        seen.push_back(*record->bundleIdentifier());
        fs::remove(userEntry(seen.back()));
        EXPECT_EQ(record->dataContainerURL(), std::nullopt);
    });
    EXPECT_EQ(seen.size(), 100U);
    EXPECT_TRUE(identifiers(registry_, user).empty());
}

TEST_F(LinuxApplicationRegistryTest, theUsersEntryHidesTheSystems) {
    writeFile(systemEntry("org.example.A"), entry("System"));
    EXPECT_EQ(nameOf("org.example.A"), "System");
    writeFile(userEntry("org.example.A"), entry("User"));
    EXPECT_EQ(identifiers(registry_, user), Names{"org.example.A"});
    EXPECT_TRUE(identifiers(registry_, system).empty());
    EXPECT_EQ(nameOf("org.example.A"), "User");
    fs::remove(userEntry("org.example.A"));
    EXPECT_EQ(nameOf("org.example.A"), "System");
}

TEST_F(LinuxApplicationRegistryTest, anEntryThatSaysHiddenHidesTheSystemsToo) {
    writeFile(systemEntry("org.example.A"), entry("System"));
    writeFile(userEntry("org.example.A"), entry("User", "Hidden=true\n"));
    EXPECT_TRUE(identifiers(registry_, user).empty());
    EXPECT_TRUE(identifiers(registry_, system).empty());
    EXPECT_EQ(nameOf("org.example.A"), "no record");
}

TEST_F(LinuxApplicationRegistryTest, bothKindsTellOfOneReading) {
    writeFile(userEntry("org.example.A"), entry("A"));
    EXPECT_EQ(identifiers(registry_, user), Names{"org.example.A"});
    // Neither twice nor not at all, though it goes from one folder to the other in between.
    std::filesystem::rename(userEntry("org.example.A"), systemEntry("org.example.A"));
    EXPECT_TRUE(identifiers(registry_, system).empty());
    EXPECT_TRUE(identifiers(registry_, user).empty());
    EXPECT_EQ(identifiers(registry_, system), Names{"org.example.A"});
}

TEST_F(LinuxApplicationRegistryTest, whatABlockIsHandedAnswersAsItWasRead) {
    writeFile(userEntry("org.example.A"), entry("A", "X-KvFileSharingEnabled=true\n"));
    makeContainer("org.example.A");
    std::shared_ptr<const BundleRecord> kept;
    registry_.enumerateApplications(user, [&](const auto& record) {
        kept = record;
        std::filesystem::remove(userEntry("org.example.A"));
        std::filesystem::remove_all(container("org.example.A"));
        EXPECT_EQ(record->localizedName(), "A");
        EXPECT_TRUE(record->fileSharingEnabled());
        EXPECT_EQ(record->dataContainerURL(), URL::fileURL(container("org.example.A")));
    });
    ASSERT_TRUE(kept);
    EXPECT_EQ(kept->localizedName(), std::nullopt);
    EXPECT_EQ(kept->dataContainerURL(), std::nullopt);
}

TEST_F(LinuxApplicationRegistryTest, whatIsNotShownInMenusIsAnApplicationAllTheSame) {
    writeFile(userEntry("org.example.A"), entry("A", "NoDisplay=true\n"));
    writeFile(userEntry("org.example.Link"), "[Desktop Entry]\nType=Link\nName=L\n");
    writeFile(userEntry("org.example.None"), "[Desktop Entry]\nName=N\n");
    EXPECT_EQ(identifiers(registry_, user), Names{"org.example.A"});
}

TEST_F(LinuxApplicationRegistryTest, entriesThatFlatpakExportsAreLinks) {
    makeFolder(home(".local/share/flatpak/exports/share/applications"));
    writeFile(home("real.desktop"), entry("Exported"));
    fs::create_symlink(
        home("real.desktop"),
        home(".local/share/flatpak/exports/share/applications/org.example.F.desktop"));
    fs::create_symlink("nowhere", userEntry("org.example.Broken"));
    fs::create_symlink(".", userEntry("org.example.Folder"));
    EXPECT_EQ(identifiers(registry_, user), Names{"org.example.F"});
    EXPECT_EQ(nameOf("org.example.F"), "Exported");
}

TEST_F(LinuxApplicationRegistryTest, namesComeInTheUsersLanguageAndFollowTheEntry) {
    writeFile(userEntry("org.example.A"), entry("Notes", "Name[de]=Notizen\n"));
    const auto record = registry_.bundleRecordForIdentifier("org.example.A");
    ASSERT_TRUE(record);
    EXPECT_EQ(record->localizedName(), "Notizen");
    writeFile(userEntry("org.example.A"), entry("Notes", "Name[de]=Zettel\n"));
    EXPECT_EQ(record->localizedName(), "Zettel");
    EXPECT_EQ(LinuxApplicationRegistry(options())
                  .bundleRecordForIdentifier("org.example.A")
                  ->localizedName(),
              "Notes");
}

TEST_F(LinuxApplicationRegistryTest, whatAnApplicationSaysIsReadFromItsKeys) {
    writeFile(userEntry("org.example.A"), entry("A", "X-KvSupportsOpenInPlace=true\n"));
    writeFile(userEntry("org.example.B"), "[Desktop Entry]\nType=Application\nName=B\n");
    const auto a = registry_.bundleRecordForIdentifier("org.example.A");
    const auto b = registry_.bundleRecordForIdentifier("org.example.B");
    EXPECT_TRUE(a->supportsOpenInPlace());
    EXPECT_FALSE(a->fileSharingEnabled());
    EXPECT_EQ(info(*a),
              (PropertyListDictionary{{"KvSupportsDocumentBrowser", PropertyList(true)}}));
    EXPECT_EQ(info(*b), PropertyListDictionary());
    EXPECT_TRUE(a->isApplication());
}

TEST_F(LinuxApplicationRegistryTest, anEntryThatCantBeReadSaysNothing) {
    writeFile(userEntry("org.example.Junk"), std::string(1U << 20U, 'x'));
    writeFile(userEntry("org.example.Huge"), entry("Huge") + std::string(1U << 20U, '\n'));
    writeFile(userEntry("org.example.Empty"), "");
    writeFile(userEntry("org.example.Secret"), entry("Secret"));
    fs::permissions(userEntry("org.example.Secret"), fs::perms::none);
    makeContainer("org.example.Junk");
    for (const char* name : {"Junk", "Huge", "Empty"}) {
        const auto record = registry_.bundleRecordForIdentifier("org.example." + std::string(name));
        ASSERT_TRUE(record) << name;
        EXPECT_EQ(info(*record), std::nullopt);
        EXPECT_EQ(record->localizedName(), std::nullopt);
        EXPECT_FALSE(record->supportsOpenInPlace());
    }
    EXPECT_EQ(containerOf("org.example.Junk"), container("org.example.Junk"));
    EXPECT_TRUE(registry_.documentFolders().empty());
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    EXPECT_EQ(info(*registry_.bundleRecordForIdentifier("org.example.Secret")), std::nullopt);
}

TEST_F(LinuxApplicationRegistryTest, whatIsNoFileIsNoEntry) {
    ASSERT_EQ(::mkfifo(userEntry("org.example.Pipe").c_str(), 0600), 0);
    makeFolder(userEntry("org.example.Folder"));
    fs::create_symlink("/dev/zero", userEntry("org.example.Zero"));
    EXPECT_TRUE(identifiers(registry_, user).empty());
    EXPECT_FALSE(registry_.bundleRecordForIdentifier("org.example.Pipe"));
}

TEST_F(LinuxApplicationRegistryTest, identifiersThatCantNameAFolderAreNone) {
    makeFolder(home(".var/app/Documents"));
    makeFolder(home(".var/Documents"));
    for (const char* name : {".desktop", "..desktop", "...desktop"}) {
        writeFile(home(".local/share/applications/") + name, entry("A"));
    }
    EXPECT_TRUE(identifiers(registry_, user).empty());
    EXPECT_FALSE(registry_.bundleRecordForIdentifier(""));
    EXPECT_FALSE(registry_.bundleRecordForIdentifier(".."));
    EXPECT_FALSE(registry_.bundleRecordForIdentifier("../../etc"));
}

TEST_F(LinuxApplicationRegistryTest, namesMayBeAnyBytes) {
    const std::string name = "org.\xff weird\n=#";
    writeFile(userEntry(name), entry("A"));
    makeContainer(name);
    EXPECT_EQ(identifiers(registry_, user), Names{name});
    EXPECT_EQ(containerOf(name), container(name));
}

TEST_F(LinuxApplicationRegistryTest, aContainerIsARealFolderWithRealDocuments) {
    writeFile(userEntry("org.example.A"), entry("A"));
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    makeFolder(container("org.example.A"));
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    const std::string documents = container("org.example.A") + "/Documents";
    writeFile(documents, "");
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    fs::remove(documents);
    fs::create_directory_symlink("/tmp", documents);
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    fs::remove(documents);
    makeFolder(documents);
    EXPECT_EQ(registry_.documentFolders(), Names{documents});
    EXPECT_EQ(containerOf("org.example.A"), container("org.example.A"));
    fs::rename(container("org.example.A"), home(".var/app/elsewhere"));
    fs::create_directory_symlink("elsewhere", container("org.example.A"));
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    EXPECT_TRUE(registry_.documentFolders().empty());
}

TEST_F(LinuxApplicationRegistryTest, foldersAreThoseOfApplicationsThatWantThemServed) {
    const std::string head = "[Desktop Entry]\nType=Application\nName=A\n";
    makeContainer("org.example.A");
    for (const char* lines : {"", "X-KvFileSharingEnabled=true\n", "X-KvSupportsOpenInPlace=true\n",
                              "X-KvSupportsDocumentBrowser=false\n"}) {
        writeFile(userEntry("org.example.A"), head + lines);
        EXPECT_TRUE(registry_.documentFolders().empty()) << lines;
    }
    for (const char* lines : {"X-KvFileSharingEnabled=true\nX-KvSupportsOpenInPlace=true\n",
                              "X-KvSupportsDocumentBrowser=true\n"}) {
        writeFile(userEntry("org.example.A"), head + lines);
        EXPECT_EQ(registry_.documentFolders(), Names{container("org.example.A") + "/Documents"})
            << lines;
    }
}

TEST_F(LinuxApplicationRegistryTest, aHomeBehindALinkHasContainersAtTheirRealPlace) {
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    fs::rename(home(".var"), home("elsewhere"));
    fs::create_directory_symlink("elsewhere", home(".var"));
    (void)registry_.documentFolders();
    EXPECT_EQ(containerOf("org.example.A"), home("elsewhere/app/org.example.A"));
}

TEST_F(LinuxApplicationRegistryTest, aContainerOnAnotherVolumeIsRefusedWithOneLine) {
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    const auto mount = ScopedMount::memory(container("org.example.A") + "/Documents");
    if (!mount) {
        MARROWDALE_SKIP_FOR_USER("nothing can be mounted");
    }
    EXPECT_TRUE(registry_.documentFolders().empty());
    EXPECT_TRUE(registry_.documentFolders().empty());
    EXPECT_EQ(containerOf("org.example.A"), std::nullopt);
    EXPECT_EQ(registry_.refusedLibraries(),
              (std::vector<LinuxApplicationRegistry::Refused>{
                  {"org.example.A", DataContainers::Refusal::otherVolume}}));
    EXPECT_EQ(
        sink_->count("[ERROR] can't serve the documents of org.example.A: they lie on another "
                     "volume than the storage root"),
        1U);
}

TEST_F(LinuxApplicationRegistryTest, documentsThatCantBeReadAreRefused) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    fs::permissions(container("org.example.A") + "/Documents", fs::perms::none);
    EXPECT_TRUE(registry_.documentFolders().empty());
    EXPECT_EQ(registry_.refusedLibraries().size(), 1U);
}

TEST_F(LinuxApplicationRegistryTest, aLibraryNeverOverlapsTheStorageRoot) {
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    auto inside = options();
    inside.storageRoot = container("org.example.A") + "/Documents";
    EXPECT_TRUE(LinuxApplicationRegistry(inside).documentFolders().empty());
    auto around = options();
    around.storageRoot = home("");
    around.storageRoot.pop_back();
    EXPECT_TRUE(LinuxApplicationRegistry(around).documentFolders().empty());
}

TEST_F(LinuxApplicationRegistryTest, aFolderIsFoundByItsRecord) {
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    const auto found = [&](const std::string& path) {
        const auto record = registry_.proxyFor(URL::fileURL(path), URLRelationship::same);
        return record ? *record->bundleIdentifier() : "none";
    };
    EXPECT_EQ(found(container("org.example.A")), "org.example.A");
    EXPECT_EQ(found(container("org.example.A") + "/Documents"), "org.example.A");
    EXPECT_EQ(found(container("org.example.A") + "/./Documents"), "org.example.A");
    EXPECT_EQ(found(container("org.example.A") + "/Documents/a"), "none");
    EXPECT_EQ(found(container("org.example.B") + "/Documents"), "none");
    EXPECT_EQ(found(home("Documents")), "none");
    EXPECT_TRUE(registry_.proxyFor(URL::fileURL(container("org.example.A") + "/x/y"),
                                   URLRelationship::contains));
    EXPECT_TRUE(registry_.proxyFor(URL::fileURL("/elsewhere"), URLRelationship::other));
}

TEST_F(LinuxApplicationRegistryTest, aRecordFromAnArchiveComesToLifeWithItsApplication) {
    const auto record = registry_.unarchivedRecord({"org.example.A"});
    EXPECT_EQ(record->bundleIdentifier(), "org.example.A");
    EXPECT_EQ(record->dataContainerURL(), std::nullopt);
    EXPECT_EQ(record->localizedName(), std::nullopt);
    EXPECT_EQ(archived(*record), ArchivedBundleRecord{"org.example.A"});
    makeContainer("org.example.A");
    EXPECT_EQ(record->dataContainerURL(), std::nullopt);
    writeFile(userEntry("org.example.A"), entry("A"));
    (void)registry_.documentFolders();
    EXPECT_EQ(record->localizedName(), "A");
    EXPECT_EQ(record->dataContainerURL(), URL::fileURL(container("org.example.A")));
    EXPECT_EQ(registry_.unarchivedRecord({""})->bundleIdentifier(), std::nullopt);
}

TEST_F(LinuxApplicationRegistryTest, itsOwnerIsToldOfDocumentsFoldersBeforeAnybodyElse) {
    std::vector<Names> told;
    auto withOwner = options();
    withOwner.documentFoldersChanged = [&](const Names& paths) { told.push_back(paths); };
    LinuxApplicationRegistry registry(withOwner);
    (void)identifiers(registry, user);
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    registry.enumerateApplications(user, [&](const auto&) { EXPECT_EQ(told.size(), 2U); });
    (void)identifiers(registry, user);
    writeFile(userEntry("org.example.Silent"), "[Desktop Entry]\nType=Application\nName=S\n");
    makeContainer("org.example.Silent");
    (void)identifiers(registry, user);
    fs::remove(userEntry("org.example.A"));
    (void)identifiers(registry, user);
    EXPECT_EQ(told, (std::vector<Names>{{}, {container("org.example.A") + "/Documents"}, {}}));
}

TEST_F(LinuxApplicationRegistryTest, anotherFolderAtTheSamePathIsToldToo) {
    writeFile(userEntry("org.example.A"), entry("A"));
    makeContainer("org.example.A");
    std::vector<Names> told;
    auto withOwner = options();
    withOwner.documentFoldersChanged = [&](const Names& paths) { told.push_back(paths); };
    LinuxApplicationRegistry registry(withOwner);
    (void)identifiers(registry, user);
    fs::rename(container("org.example.A") + "/Documents", home("away"));
    makeContainer("org.example.A");
    (void)identifiers(registry, user);
    const Names both{container("org.example.A") + "/Documents"};
    EXPECT_EQ(told, (std::vector<Names>{both, both}));
}

TEST_F(LinuxApplicationRegistryTest, packageExtensionsComeFromAllApplications) {
    writeFile(userEntry("org.example.A"), entry("A", "X-KvPackageExtensions=note;sketch;\n"));
    writeFile(systemEntry("org.example.B"), entry("B", "X-KvPackageExtensions=note\n"));
    EXPECT_EQ(registry_.packageExtensions(), (Names{"note", "sketch"}));
}

TEST_F(LinuxApplicationRegistryTest, iconsAreAskedForByTheNameInTheEntry) {
    std::vector<std::string> asked;
    auto withIcons = options();
    withIcons.icons = [&](const std::optional<std::string>& icon, int variant) {
        asked.push_back(icon.value_or("none") + " " + std::to_string(variant));
        return std::optional(Data::fromText("icon"));
    };
    LinuxApplicationRegistry registry(withIcons);
    writeFile(userEntry("org.example.A"), entry("A", "Icon=notes\n"));
    writeFile(userEntry("org.example.B"), entry("B"));
    EXPECT_EQ(registry.bundleRecordForIdentifier("org.example.A")->iconDataForVariant(32)->text(),
              "icon");
    EXPECT_TRUE(registry.bundleRecordForIdentifier("org.example.B")->iconDataForVariant(0));
    EXPECT_TRUE(registry.unarchivedRecord({"gone"})->iconDataForVariant(1));
    EXPECT_EQ(asked, (Names{"notes 32", "none 0", "none 1"}));
}

TEST_F(LinuxApplicationRegistryTest, aThousandEntriesAreAllFound) {
    for (int i = 0; i < 1000; ++i) {
        const std::string path = userEntry("org.example.A" + std::to_string(i));
        writeFile(path, entry("A"));
    }
    EXPECT_EQ(identifiers(registry_, user).size(), 1000U);
    EXPECT_EQ(identifiers(registry_, user).size(), 1000U);
    EXPECT_EQ(registry_.bundleRecordForIdentifier("org.example.A7")->localizedName(), "A");
}

}  // namespace
}  // namespace marrowdale::native
