#include <cerrno>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sys/stat.h>

#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/apps/AppsTestWorld.h"

namespace marrowdale {
namespace {

class LocalAppLibraryRefreshTest : public AppsTestWorld {
  protected:
    // An application that says this of itself; whether it qualifies.
    bool qualifies(PropertyListDictionary info, bool opensInPlace, bool sharesFiles) {
        const auto record = add("App");
        record->info = std::move(info);
        record->opensInPlace = opensInPlace;
        record->sharesFiles = sharesFiles;
        (void)refresh();
        const bool found = !cached().empty();
        remove("App");
        return found;
    }
};

TEST_F(LocalAppLibraryRefreshTest, theKeyQualifiesOrBothOthersTogether) {
    const PropertyListDictionary yes{{"KvSupportsDocumentBrowser", PropertyList(true)}};
    const PropertyListDictionary no{{"KvSupportsDocumentBrowser", PropertyList(false)}};
    EXPECT_TRUE(qualifies(yes, false, false));
    EXPECT_TRUE(qualifies({}, true, true));
    EXPECT_TRUE(qualifies(no, true, true));
    EXPECT_FALSE(qualifies({}, true, false));
    EXPECT_FALSE(qualifies({}, false, true));
    EXPECT_FALSE(qualifies({}, false, false));
    EXPECT_FALSE(qualifies(no, true, false));
}

TEST_F(LocalAppLibraryRefreshTest, theKeyIsReadAsABoolean) {
    const auto value = [](auto&& content) {
        return PropertyListDictionary{{"KvSupportsDocumentBrowser", PropertyList(content)}};
    };
    EXPECT_TRUE(qualifies(value(std::int64_t{1}), false, false));
    EXPECT_FALSE(qualifies(value(std::int64_t{0}), false, false));
    EXPECT_FALSE(qualifies(value(std::string("perhaps")), false, false));
}

TEST_F(LocalAppLibraryRefreshTest, anApplicationWithoutAContainerIsSkippedSilently) {
    add("App")->container = std::nullopt;
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_F(LocalAppLibraryRefreshTest, anApplicationWhoseDescriptionCantBeReadIsSkipped) {
    const auto record = add("App");
    record->info = std::nullopt;
    record->opensInPlace = record->sharesFiles = true;
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_F(LocalAppLibraryRefreshTest, whatIsNoApplicationIsAnErrorLine) {
    world_.applications.add(std::shared_ptr<const FakeBundleRecord>());
    add("Link")->isOne = false;
    add("App");
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(count("[ERROR] enumerate Application provided nil proxy"), 2U);
    EXPECT_EQ(cached(), Lines{"org.example.App"});
}

TEST_F(LocalAppLibraryRefreshTest, userApplicationsComeFirst) {
    const auto system = add("System");
    remove("System");
    world_.applications.add(system, ApplicationKind::system);
    add("User");
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(cached(), (Lines{"org.example.User", "org.example.System"}));
    EXPECT_EQ(world_.applications.enumerations(),
              (std::vector{ApplicationKind::user, ApplicationKind::system}));
}

TEST_F(LocalAppLibraryRefreshTest, itsLogTellsEveryStep) {
    add("App");
    const auto anonymous = add("Nameless");
    anonymous->identifier = std::nullopt;
    ASSERT_EQ(refresh(), Changed::yes);
    const Lines expected = {
        "refreshing app libraries",
        "retrieving app libraries from rostrum",
        "[DEBUG] add org.example.App",
        "[DEBUG] add <unknown>",
        "[DEBUG] bundle proxies [<BundleRecord org.example.App>, <BundleRecord <unknown>>]",
        "[DEBUG] nothing cached on disk",
        "saving bundle proxies to ~/",
        "wrote on disk ",
        "[DEBUG] main cache version token is now 1"};
    const auto lines = world_.sink->lines();
    auto at = lines.begin();
    for (const std::string& text : expected) {
        at = std::find_if(at, lines.end(), [&](const auto& line) { return line.contains(text); });
        EXPECT_NE(at, lines.end()) << text;
    }
}

TEST_F(LocalAppLibraryRefreshTest, theSameApplicationsChangeNothing) {
    add("A");
    add("B");
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(token(), 1U);
    EXPECT_EQ(count("[DEBUG] bundle proxies are identical to previous version"), 1U);
}

TEST_F(LocalAppLibraryRefreshTest, noApplicationsAtAllChangeNothing) {
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(token(), 0U);
    EXPECT_FALSE(std::filesystem::exists(mainFile()));
}

TEST_F(LocalAppLibraryRefreshTest, anotherOrderIsAChange) {
    add("A");
    add("B");
    EXPECT_EQ(refresh(), Changed::yes);
    world_.applications.reverse();
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(token(), 2U);
}

TEST_F(LocalAppLibraryRefreshTest, applicationsThatComeAndGoRaiseTheTokenByOneEachTime) {
    add("A");
    EXPECT_EQ(refresh(), Changed::yes);
    add("B");
    EXPECT_EQ(refresh(), Changed::yes);
    remove("A");
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(token(), 3U);
    EXPECT_EQ(cached(), Lines{"org.example.B"});
}

TEST_F(LocalAppLibraryRefreshTest, aCacheThatCantBeWrittenCountsAsNoChange) {
    add("A");
    makeFolder(mainFile() + "/in the way");
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(countContaining("[ERROR] can't refresh app libraries; "), 1U);
    EXPECT_EQ(token(), 0U);
}

TEST_F(LocalAppLibraryRefreshTest, aDamagedCacheIsRebuiltByTheNextRefresh) {
    add("A");
    ASSERT_EQ(refresh(), Changed::yes);
    for (const std::string_view junk : {"", "bplist00", "not a list at all"}) {
        writeFile(mainFile(), junk);
        EXPECT_EQ(refresh(), Changed::yes);
        EXPECT_EQ(token(), 1U);
        EXPECT_EQ(cached(), Lines{"org.example.A"});
    }
}

// Whatever a damaged list is taken for, the next refresh and upgrade have the right one.
TEST_F(LocalAppLibraryRefreshTest, anyByteOfTheCacheMayBeAnother) {
    add("A");
    add("B");
    const Lines all{"org.example.A", "org.example.B"};
    ASSERT_EQ(refresh(), Changed::yes);
    const std::string whole = readFile(mainFile());
    for (std::size_t at = 0; at < whole.size(); ++at) {
        std::string damaged = whole;
        damaged[at] = static_cast<char>(damaged[at] ^ (at % 2 == 0 ? 0x01 : 0x80));
        writeFile(mainFile(), damaged);
        (void)refresh();
        ASSERT_EQ(cached(), all) << at;
        const LocalAppLibraryManager fresh(world_.platform, Source::main);
        ASSERT_EQ(identifiers(fresh), (Lines{"#org.example.A", "#org.example.B"})) << at;
        ASSERT_EQ(fresh.versionToken(), token()) << at;
    }
}

TEST_F(LocalAppLibraryRefreshTest, whatIsNoFileInTheCachesPlaceIsReplaced) {
    add("A");
    ASSERT_EQ(refresh(), Changed::yes);
    const std::string other = directory_.path("other");
    const std::vector<std::pair<std::string, std::function<void()>>> kinds{
        {"a pipe", [this] { ASSERT_EQ(::mkfifo(mainFile().c_str(), 0600), 0); }},
        {"a link to nothing", [this] { std::filesystem::create_symlink("nothing", mainFile()); }},
        {"a link to another file",
         [&] {
             writeFile(other, "left alone");
             std::filesystem::create_symlink(other, mainFile());
         }},
        {"an endless file", [this] { std::filesystem::create_symlink("/dev/zero", mainFile()); }}};
    for (const auto& [kind, make] : kinds) {
        std::filesystem::remove(mainFile());
        make();
        EXPECT_EQ(refresh(), Changed::yes) << kind;
        EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(mainFile())))
            << kind;
        EXPECT_EQ(token(), 1U) << kind;
        EXPECT_EQ(cached(), Lines{"org.example.A"}) << kind;
    }
    EXPECT_EQ(readFile(other), "left alone");
}

TEST_F(LocalAppLibraryRefreshTest, onAFullDiskTheOldListStaysUntilThereIsRoom) {
    const std::string folder = std::filesystem::path(mainFile()).parent_path();
    makeFolder(folder);
    const auto disk = ScopedMount::memory(folder, "size=64k");
    if (!disk) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    add("A");
    ASSERT_EQ(refresh(), Changed::yes);
    const std::string filler = folder + "/filler";
    {
        std::ofstream out(filler, std::ios::binary);
        for (int i = 0; i < 64 && out; ++i) {
            out << std::string(4096, 'x') << std::flush;
        }
    }
    add("B");
    EXPECT_EQ(refresh(), Changed::no);
    EXPECT_EQ(countContaining("[ERROR] can't refresh app libraries; "), 1U);
    EXPECT_EQ(token(), 1U);
    EXPECT_EQ(cached(), Lines{"org.example.A"});
    std::filesystem::remove(filler);
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(token(), 2U);
    EXPECT_EQ(cached(), (Lines{"org.example.A", "org.example.B"}));
}

TEST_F(LocalAppLibraryRefreshTest, aThousandApplicationsAreKept) {
    for (int i = 0; i < 1000; ++i) {
        add("App" + std::to_string(i));
    }
    EXPECT_EQ(refresh(), Changed::yes);
    EXPECT_EQ(cached().size(), 1000U);
    EXPECT_EQ(refresh(), Changed::no);
    const LocalAppLibraryManager manager(world_.platform, Source::main);
    EXPECT_EQ(manager.items().size(), 1000U);
}

}  // namespace
}  // namespace marrowdale
