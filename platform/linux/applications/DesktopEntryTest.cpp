#include <random>

#include <gtest/gtest.h>

#include "platform/linux/applications/DesktopEntry.h"

namespace marrowdale::native {
namespace {

std::optional<DesktopEntry> parse(std::string_view lines, const std::string& locale = {}) {
    return parseDesktopEntry("[Desktop Entry]\n" + std::string(lines), locale);
}

TEST(DesktopEntryTest, readsWhatConcernsUs) {
    const auto entry = parse(
        "Type=Application\nName=Notes\nIcon=notes\nNoDisplay=true\n"
        "X-KvSupportsDocumentBrowser=true\nX-KvFileSharingEnabled=false\nX-KvOther=some text\n"
        "X-KvPackageExtensions=note;sketch;\nX-Other=1\n"
        "[Desktop Action new]\nName=New\nX-KvSupportsOpenInPlace=true\n");
    ASSERT_TRUE(entry);
    EXPECT_TRUE(entry->isApplication);
    EXPECT_FALSE(entry->isHidden);
    EXPECT_EQ(entry->name, "Notes");
    EXPECT_EQ(entry->icon, "notes");
    EXPECT_EQ(entry->info,
              (PropertyListDictionary{
                  {"KvSupportsDocumentBrowser", PropertyList(true)},
                  {"KvFileSharingEnabled", PropertyList(false)},
                  {"KvOther", PropertyList(std::string("some text"))},
                  {"KvPackageExtensions",
                   PropertyList(PropertyListArray{PropertyList(std::string("note")),
                                                  PropertyList(std::string("sketch"))})}}));
    EXPECT_TRUE(entry->says("KvSupportsDocumentBrowser"));
    EXPECT_FALSE(entry->says("KvFileSharingEnabled"));
    EXPECT_FALSE(entry->says("KvOther"));
    EXPECT_FALSE(entry->says("KvSupportsOpenInPlace"));
    EXPECT_EQ(entry->packageExtensions(), (std::vector<std::string>{"note", "sketch"}));
}

TEST(DesktopEntryTest, namesComeInTheUsersLanguage) {
    constexpr std::string_view names =
        "Type=Application\nName=Notes\nName[de]=Notizen\nName[de_AT]=Zettel\n"
        "Name[sr@latin]=Beleske\nName[fr]=\nIcon=a\nIcon[de]=b\n";
    EXPECT_EQ(parse(names)->name, "Notes");
    EXPECT_EQ(parse(names, "de_AT.UTF-8")->name, "Zettel");
    EXPECT_EQ(parse(names, "de_DE.UTF-8")->name, "Notizen");
    EXPECT_EQ(parse(names, "de")->name, "Notizen");
    EXPECT_EQ(parse(names, "sr_RS@latin")->name, "Beleske");
    EXPECT_EQ(parse(names, "es_ES.UTF-8")->name, "Notes");
    EXPECT_EQ(parse(names, "not a locale")->name, "Notes");
    EXPECT_EQ(parse(names, "de_DE.UTF-8")->icon, "b");
    EXPECT_EQ(parse(names, "fr")->name, std::nullopt);
}

TEST(DesktopEntryTest, escapesAreTakenOut) {
    EXPECT_EQ(parse("Name=a\\sb\\tc\\\\d\n")->name, "a b\tc\\d");
    EXPECT_EQ(parse("Name = spaced \n")->name, "spaced ");
    EXPECT_EQ(parse("# a comment\n\nName=\xc3\xa9\n")->name, "\xc3\xa9");
}

TEST(DesktopEntryTest, anEntryWithoutAKeyLacksIt) {
    const auto entry = parse("");
    ASSERT_TRUE(entry);
    EXPECT_FALSE(entry->isApplication);
    EXPECT_EQ(entry->name, std::nullopt);
    EXPECT_EQ(entry->icon, std::nullopt);
    EXPECT_TRUE(entry->info.empty());
    EXPECT_TRUE(entry->packageExtensions().empty());
    EXPECT_FALSE(parse("Type=Link\n")->isApplication);
    EXPECT_TRUE(parse("Hidden=true\n")->isHidden);
    EXPECT_FALSE(parse("Hidden=maybe\n")->isHidden);
}

TEST(DesktopEntryTest, textThatIsNoTextIsLeftOut) {
    const auto entry = parse("Name=\xff\xfe\nX-KvA=\xff\nX-KvB=b\n");
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->name, std::nullopt);
    EXPECT_EQ(entry->info.size(), 1U);
}

TEST(DesktopEntryTest, aKeyOfALanguageIsNoKeyOfOurs) {
    EXPECT_TRUE(parse("X-KvSupportsDocumentBrowser[de]=true\n")->info.empty());
}

TEST(DesktopEntryTest, whatIsNoEntryIsNone) {
    EXPECT_FALSE(parseDesktopEntry("", {}));
    EXPECT_FALSE(parseDesktopEntry("Name=Notes\n", {}));
    EXPECT_FALSE(parseDesktopEntry("[Other]\nName=Notes\n", {}));
    EXPECT_FALSE(parseDesktopEntry(std::string_view("[Desktop Entry]\nName=a\0b\n", 25), {}));
    EXPECT_FALSE(parseDesktopEntry("[Desktop Entry\nName=a\n", {}));
    EXPECT_FALSE(parseDesktopEntry(std::string(1U << 20U, 'x'), {}));
    EXPECT_FALSE(parse("no equals sign\n"));
}

TEST(DesktopEntryTest, anyBytesAreReadOrRefused) {
    const std::string whole =
        "[Desktop Entry]\nType=Application\nName=Notes\nName[de]=Notizen\nIcon=notes\n"
        "X-KvPackageExtensions=a;b;\nX-KvSupportsDocumentBrowser=true\n[X]\nA=b\n";
    std::mt19937 random(20);  // NOLINT(cert-msc51-cpp): the same ones each time
    for (int round = 0; round < 20'000; ++round) {
        std::string bytes = whole.substr(0, random() % (whole.size() + 1));
        for (unsigned i = random() % 4; i > 0 && !bytes.empty(); --i) {
            bytes[random() % bytes.size()] = static_cast<char>(random());
        }
        if (const auto entry = parseDesktopEntry(bytes, "de_DE.UTF-8")) {
            EXPECT_LE(entry->packageExtensions().size(), bytes.size());
        }
    }
}

}  // namespace
}  // namespace marrowdale::native
