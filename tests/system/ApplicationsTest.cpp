// Which applications are served, and how a program asks for them.

#include <filesystem>
#include <random>
#include <sys/stat.h>
#include <tuple>

#include <gmock/gmock.h>

#include "host/client/HttpConnection.h"
#include "tests/system/ApplicationHome.h"
#include "tests/system/Service.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

class ApplicationsTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::vector<std::string> apps() const {
        return field(home_.lines({"apps"}), "itemIdentifier");
    }
    [[nodiscard]] std::string names(const std::string& language) const {
        ChildOptions options = home_.command({"--json", "apps"});
        options.variables["LANG"] = language;
        std::string all;
        for (const Json& item : parsedLines(runChild(options).output)) {
            all += (all.empty() ? "" : " ") + text(item, "filename");
        }
        return all;
    }
    [[nodiscard]] Json finding(const std::string& name) const {
        for (const Json& one : home_.lines({"doctor"})) {
            if (one.at("finding") == name) {
                return one;
            }
        }
        ADD_FAILURE() << "no finding " << name;
        return {};
    }
    ApplicationHome home_;
};

TEST_F(ApplicationsTest, aLibraryIsListedWithTheRootAndInfoTellsTheSame) {
    home_.install(notes, "Notes");
    makeFolder(home_.library(notes) + "/sub");
    makeFolder(home_.library(notes) + "/Inbox");
    makeFolder(home_.library(notes) + "/.Trash");
    writeFile(home_.document("a.txt"), "a");
    const auto root = home_.lines({"ls"});
    ASSERT_THAT(field(root, "filename"), ElementsAre("Notes", "a.txt"));
    EXPECT_EQ(root[0].at("itemIdentifier"), "#" + notes);
    EXPECT_EQ(root[0].at("parentItemIdentifier"), "VantrelRootContainerItemIdentifier");
    EXPECT_EQ(root[0].at("path"), home_.library(notes));
    EXPECT_EQ(root[0].at("isContainer"), true);
    EXPECT_EQ(root[0].at("isFolder"), true);
    EXPECT_EQ(root[0].at("childItemCount"), 1);
    EXPECT_EQ(root[0].at("capabilities"), 3);
    EXPECT_EQ(home_.line({"apps"}), root[0]);
    EXPECT_EQ(home_.line({"app", notes}), root[0]);
    EXPECT_EQ(home_.line({"info", "#" + notes}), root[0]);
    EXPECT_EQ(home_.line({"info", home_.library(notes)}), root[0]);
    EXPECT_EQ(home_.line({"path", "#" + notes}).at("path"), home_.library(notes));
}

TEST_F(ApplicationsTest, withoutApplicationsThereAreNone) {
    EXPECT_THAT(apps(), IsEmpty());
    EXPECT_EQ(home_.run({"apps"}).output, "");
    EXPECT_EQ(home_.run({"refresh"}).output, "");
}

TEST_F(ApplicationsTest, appAnswersWithoutTheKeyAndRefusesWhatIsNotThere) {
    makeFolder(home_.library(notes));
    home_.writeEntry(notes, "Name=Notes\n");
    EXPECT_THAT(apps(), IsEmpty());
    EXPECT_EQ(home_.line({"app", notes}).at("itemIdentifier"), "#" + notes);
    home_.writeEntry(sketch, "Name=Sketch\nX-KvSupportsDocumentBrowser=true\n");
    for (const std::string& identifier : {sketch, std::string("org.example.None"), std::string()}) {
        const Json error = home_.error({"app", identifier}, 1);
        EXPECT_EQ(error.at("name"), "invalidParameter");
        EXPECT_EQ(error.at("parameter"), "bundleIdentifier");
        EXPECT_EQ(error.at("value"), identifier);
    }
    EXPECT_EQ(home_.run({"app"}).exitCode, 2);
    EXPECT_EQ(home_.run({"apps", "x"}).exitCode, 2);
    EXPECT_EQ(home_.run({"refresh", "x"}).exitCode, 2);
}

TEST_F(ApplicationsTest, openingInPlaceAndFileSharingTogetherDoAsWell) {
    makeFolder(home_.library(notes));
    home_.writeEntry(notes, "Name=x\nX-KvSupportsOpenInPlace=true\nX-KvFileSharingEnabled=true\n");
    makeFolder(home_.library(sketch));
    home_.writeEntry(sketch, "Name=y\nX-KvSupportsOpenInPlace=true\n");
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
}

TEST_F(ApplicationsTest, namesComeInTheUsersLanguageAndAsTheyAreNow) {
    home_.install(notes, "Notes\nName[de]=Notizen");
    EXPECT_EQ(names("de_AT.UTF-8"), "Notizen");
    EXPECT_EQ(names("C"), "Notes");
    home_.install(notes, "Jotter");
    EXPECT_EQ(names("C"), "Jotter");
}

TEST_F(ApplicationsTest, aUsersEntryThatIsHiddenSwitchesALibraryOff) {
    home_.install(notes, "Notes");
    home_.install(sketch, "Sketch");
    EXPECT_THAT(apps(), ElementsAre("#" + notes, "#" + sketch));
    home_.writeEntry(notes, "Hidden=true\n");
    EXPECT_THAT(apps(), ElementsAre("#" + sketch));
}

TEST_F(ApplicationsTest, applicationsComeAndGoBetweenRuns) {
    home_.writeEntry(notes, "Name=Notes\nX-KvSupportsDocumentBrowser=true\n");
    EXPECT_THAT(apps(), IsEmpty());
    makeFolder(home_.library(notes));
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    fs::remove(home_.entry(notes));
    EXPECT_THAT(apps(), IsEmpty());
    EXPECT_EQ(home_.error({"info", "#" + notes}, 1).at("name"), "noSuchItem");
    home_.install(notes, "Notes");
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    fs::remove_all(home_.library(notes));
    EXPECT_THAT(apps(), IsEmpty());
}

TEST_F(ApplicationsTest, aFolderThatIsALinkIsNotFollowed) {
    home_.install(sketch, "Sketch");
    home_.install(notes, "Notes");
    makeFolder(home_.path("elsewhere/Documents"));
    fs::remove_all(home_.library(notes));
    fs::create_directory_symlink(home_.path("elsewhere/Documents"), home_.library(notes));
    EXPECT_THAT(apps(), ElementsAre("#" + sketch));
    fs::remove_all(home_.path(".var/app/" + notes));
    fs::create_directory_symlink(home_.path("elsewhere"), home_.path(".var/app/" + notes));
    EXPECT_THAT(apps(), ElementsAre("#" + sketch));
}

TEST_F(ApplicationsTest, anUnreadableFolderIsLeftOutAndDoctorSaysSo) {
    home_.install(sketch, "Sketch");
    home_.install(notes, "Notes");
    EXPECT_EQ(finding("refused-libraries").at("status"), "ok");
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permission bits don't bind root");
    }
    ASSERT_EQ(::chmod(home_.library(notes).c_str(), 0), 0);
    EXPECT_THAT(apps(), ElementsAre("#" + sketch));
    const Json refused = finding("refused-libraries");
    EXPECT_EQ(refused.at("status"), "note");
    EXPECT_EQ(refused.at("message"),
              "documents of these applications are left out: " + notes + " (not readable)");
    ASSERT_EQ(::chmod(home_.library(notes).c_str(), 0700), 0);
}

TEST_F(ApplicationsTest, whatApplicationsSayArePackagesAreDocuments) {
    makeFolder(home_.document("plan.sketch/inside"));
    const std::string anchor = text(home_.line({"anchor", "root"}), "anchor");
    EXPECT_EQ(home_.line({"ls"}).at("isFolder"), true);
    home_.writeEntry(notes, "Name=x\nX-KvPackageExtensions=note;sketch;\n");
    const Json package = home_.line({"ls"});
    EXPECT_EQ(package.at("isFolder"), false);
    EXPECT_TRUE(text(package, "itemIdentifier").starts_with("did="));
    // Nobody goes on from a picture in which it is a folder.
    EXPECT_EQ(home_.error({"changes", "root", "--since", anchor}, 1).at("name"),
              "syncAnchorExpired");
}

TEST_F(ApplicationsTest, doctorNamesTheExtensionsOfPackages) {
    home_.writeEntry(notes, "Name=x\nX-KvPackageExtensions=note;sketch;\n");
    EXPECT_THAT(text(finding("package-extensions"), "message"), HasSubstr(".note, .sketch"));
}

TEST_F(ApplicationsTest, aThumbnailIsAPictureInTheFolderThatWasNamed) {
    home_.install(notes, "Notes");
    writeFile(home_.document("a.txt"), "a");
    const auto lines = home_.lines({"thumbnail", "#" + notes, "./a.txt", "#org.example.None",
                                    "root", "--out", home_.path("pictures")});
    ASSERT_EQ(lines.size(), 4U);
    const std::string path = home_.path("pictures/#" + notes + ".png");
    const std::string picture = readFile(path);
    EXPECT_EQ(lines[0].at("itemIdentifier"), "#" + notes);
    EXPECT_EQ(lines[0].at("bytes"), picture.size());
    EXPECT_EQ(lines[0].at("path"), path);
    EXPECT_TRUE(picture.starts_with("\x89PNG\r\n"));
    EXPECT_EQ(lines[1].at("itemIdentifier"), home_.identifierOf("a.txt"));
    for (std::size_t i = 1; i < lines.size(); ++i) {
        EXPECT_TRUE(lines[i].at("bytes").is_null()) << i;
        EXPECT_TRUE(lines[i].at("path").is_null()) << i;
    }
    // Without a folder: where the command was given.
    EXPECT_EQ(home_.line({"thumbnail", "#" + notes}).at("path"),
              home_.document("#" + notes + ".png"));
}

TEST_F(ApplicationsTest, aThumbnailThatCantBeWrittenIsAnError) {
    home_.install(notes, "Notes");
    writeFile(home_.path("file"), "");
    EXPECT_EQ(home_.error({"thumbnail", "#" + notes, "--out", home_.path("file")}, 1).at("name"),
              "posix");
    EXPECT_EQ(home_.run({"thumbnail"}).exitCode, 2);
    EXPECT_EQ(home_.run({"thumbnail", "#" + notes, "--out", ""}).exitCode, 2);
}

TEST_F(ApplicationsTest, commandsAnswerThroughAServiceAsTheyDoWithoutIt) {
    home_.install(notes, "Notes");
    home_.install(sketch, "Sketch");
    const std::string out = home_.path("out");
    const std::vector<Arguments> commands{
        {"apps"},
        {"app", notes},
        {"app", "org.example.None"},
        {"ls"},
        {"info", "#" + notes},
        {"info", "#org.example.None"},
        {"refresh"},
        {"thumbnail", "#" + notes, "#org.example.None", "--out", out}};
    for (const bool asJson : {true, false}) {
        const auto inForm = [&](Arguments command) {
            command.insert(command.begin(), asJson ? "--json" : "--verbose");
            return command;
        };
        std::vector<ChildResult> without;
        for (const Arguments& command : commands) {
            without.push_back(home_.run(inForm(command)));
        }
        const Service service(home_);
        for (std::size_t i = 0; i < commands.size(); ++i) {
            const ChildResult with = home_.run(inForm(commands[i]));
            EXPECT_EQ(with.exitCode, without[i].exitCode) << ::testing::PrintToString(commands[i]);
            EXPECT_EQ(with.output, without[i].output);
            if (asJson) {
                EXPECT_EQ(with.errors, without[i].errors);
            }
        }
    }
}

TEST_F(ApplicationsTest, programsAskForPicturesAndRefreshesOverTheSocket) {
    home_.install(notes, "Notes");
    const Service service(home_);
    auto connection = host::HttpConnection::open(home_.path(".local/state/marrowdale"));
    ASSERT_TRUE(connection.has_value());
    const auto ask = [&](const std::string& method, const std::string& target) {
        return (*connection)->send({.method = method, .target = target}).value();
    };
    const auto picture = ask("GET", "/v1/items/%23" + notes + "/thumbnail");
    EXPECT_EQ(picture.status, 200U);
    const std::string path =
        home_.line({"thumbnail", "#" + notes, "--out", home_.path("out")}).at("path");
    EXPECT_EQ(picture.body, readFile(path));
    const auto none = ask("GET", "/v1/items/root/thumbnail");
    EXPECT_EQ(none.status, 204U);
    EXPECT_EQ(none.body, "");
    EXPECT_EQ(ask("POST", "/v1/refresh").body, "{}");
    for (const auto& [method, target, status] :
         {std::tuple("GET", "/v1/refresh", 405U), std::tuple("POST", "/v1/apps", 405U),
          std::tuple("GET", "/v1/apps/none", 400U), std::tuple("GET", "/v1/apps/a/b", 404U),
          std::tuple("POST", "/v1/refresh/x", 405U)}) {
        EXPECT_EQ(ask(method, target).status, status) << method << target;
    }
}

TEST_F(ApplicationsTest, theExampleOfTheClientLibraryShowsLibrariesAndIcons) {
    home_.install(notes, "Notes");
    const Service service(home_);
    EXPECT_EQ(apps().size(), 1U);
    home_.install(sketch, "Sketch");
    makeFolder(home_.path("out"));
    ChildOptions options = home_.command({});
    options.arguments = {programFolder() + "/marrowdale_example_icons", home_.path("out")};
    const ChildResult result = runChild(options);
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    std::string expected;
    for (const auto& [identifier, name] :
         {std::pair(notes, "Notes"), std::pair(sketch, "Sketch")}) {
        const std::string picture = readFile(home_.path("out/#" + identifier + ".png"));
        EXPECT_TRUE(picture.starts_with("\x89PNG")) << identifier;
        expected += std::string(name) + "\t" + home_.library(identifier) + "\t" +
                    std::to_string(picture.size()) + "\n";
    }
    EXPECT_EQ(result.output, expected);
    options.arguments[1] = home_.path("none");
    EXPECT_THAT(runChild(options).errors, HasSubstr("can't write"));
}

TEST_F(ApplicationsTest, aServiceKnowsWhatARefreshFoundWhenTheCommandReturns) {
    const Service service(home_);
    EXPECT_THAT(apps(), IsEmpty());
    home_.install(notes, "Notes");
    EXPECT_EQ(home_.run({"refresh"}).exitCode, 0);
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    fs::remove(home_.entry(notes));
    EXPECT_EQ(home_.run({"refresh"}).exitCode, 0);
    EXPECT_THAT(apps(), IsEmpty());
}

TEST_F(ApplicationsTest, aServiceNoticesApplicationsByItself) {
    home_.install(notes, "Notes");
    const Service service(home_);
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    home_.install(sketch, "Sketch");
    EXPECT_TRUE(waitUntil([&] { return apps().size() == 2; }));
    fs::remove_all(home_.library(notes));
    EXPECT_TRUE(waitUntil([&] { return apps() == std::vector{"#" + sketch}; }));
}

TEST_F(ApplicationsTest, whoWatchesIsToldOfNewApplications) {
    const Service service(home_);
    ChildProcess watch(home_.command({"--json", "watch"}));
    std::string output;
    // When it has begun to watch it does not say.
    EXPECT_TRUE(waitUntil([&] {
        if (fs::exists(home_.entry(notes))) {
            fs::remove(home_.entry(notes));
        } else {
            home_.install(notes, "Notes");
        }
        constexpr std::chrono::seconds aWhile{2};
        output = watch.readOutput(output.size() + 1, aWhile);
        return output.contains("RootContainer") && output.contains("WorkingSet");
    }));
}

TEST_F(ApplicationsTest, aThousandApplicationsAreListedInOrder) {
    std::vector<std::string> made;
    for (int i = 1000; i < 2000; ++i) {
        const std::string identifier = "org.example.App" + std::to_string(i);
        home_.install(identifier, "App " + std::to_string(i));
        made.push_back("#" + identifier);
    }
    EXPECT_EQ(apps(), made);
    EXPECT_EQ(field(home_.lines({"ls"}), "itemIdentifier"), made);
}

TEST_F(ApplicationsTest, entriesThatAreNoEntriesStopNothing) {
    home_.install(notes, "Notes");
    writeFile(home_.entry("org.example.Junk"), std::string(1U << 20U, '\xFE'));
    writeFile(home_.entry("org.example.Empty"), "");
    ASSERT_EQ(::mkfifo(home_.entry("org.example.Pipe").c_str(), 0600), 0);
    fs::create_symlink("nowhere", home_.entry("org.example.Dangling"));
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
}

TEST_F(ApplicationsTest, aKillAtAnyMomentLeavesTheRightPictureForTheNext) {
    std::mt19937 random(5);
    home_.install(notes, "Notes");
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    for (int round = 0; round < 12; ++round) {
        const bool isThere = round % 2 == 0;
        if (isThere) {
            home_.install(sketch, "Sketch");
        } else {
            fs::remove(home_.entry(sketch));
        }
        ChildProcess process(home_.command({"apps"}));
        // Nothing is read, so this is a wait that the process may end early.
        (void)process.readOutput(SIZE_MAX, std::chrono::milliseconds(random() % 80));
        process.kill();
        (void)process.finish();
        const std::vector<std::string> expected =
            isThere ? std::vector{"#" + notes, "#" + sketch} : std::vector{"#" + notes};
        EXPECT_EQ(apps(), expected) << round;
        EXPECT_EQ(field(home_.lines({"ls"}), "itemIdentifier"), expected) << round;
    }
}

TEST_F(ApplicationsTest, aByteOfAnotherValueInACacheIsMendedByTheNextStart) {
    home_.install(notes, "Notes");
    home_.install(sketch, "Sketch");
    const auto all = std::vector{"#" + notes, "#" + sketch};
    EXPECT_EQ(apps(), all);
    for (const char* name : {"app-libraries.plist", "searchable-app-libraries.plist"}) {
        const std::string cache = home_.path(".local/share/Marrowdale/" + std::string(name));
        const std::string whole = readFile(cache);
        for (std::size_t at = 3; at < whole.size(); at += whole.size() / 8) {
            std::string damaged = readFile(cache);
            damaged[at % damaged.size()] = static_cast<char>(damaged[at % damaged.size()] ^ 4);
            writeFile(cache, damaged);
            EXPECT_EQ(apps(), all) << name << " " << at;
            EXPECT_EQ(home_.line({"id", home_.library(sketch)}).at("itemIdentifier"), "#" + sketch)
                << name << " " << at;
        }
    }
}

TEST_F(ApplicationsTest, damagedCachesAreMadeAnew) {
    home_.install(notes, "Notes");
    EXPECT_THAT(apps(), ElementsAre("#" + notes));
    for (const char* name : {"app-libraries.plist", "searchable-app-libraries.plist"}) {
        const std::string cache = home_.path(".local/share/Marrowdale/" + std::string(name));
        ASSERT_TRUE(fs::exists(cache));
        for (const std::string& contents : {std::string("junk"), std::string()}) {
            writeFile(cache, contents);
            EXPECT_THAT(apps(), ElementsAre("#" + notes)) << name;
            EXPECT_EQ(home_.line({"info", "#" + notes}).at("filename"), "Notes") << name;
        }
    }
}

}  // namespace
}  // namespace marrowdale::tests
