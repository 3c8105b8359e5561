#include <filesystem>
#include <fstream>
#include <sys/stat.h>

#include <gmock/gmock.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

using ::testing::HasSubstr;

TEST(StartTest, theVersionIsPrinted) {
    const ChildResult result = Home().run({"--version"});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.output, "marrowdale 0.1.0\n");
    EXPECT_EQ(result.errors, "");
}

TEST(StartTest, helpNamesEveryCommandAndEachCommandHasItsOwn) {
    const Home home;
    const ChildResult help = home.run({"--help"});
    EXPECT_EQ(help.exitCode, 0);
    for (const char* command :
         {"ls", "info", "id", "path", "page", "anchor", "changes", "watch", "serve", "doctor"}) {
        EXPECT_THAT(help.output, HasSubstr("\n  " + std::string(command) + " "));
        const ChildResult own = home.run({command, "--help"});
        EXPECT_EQ(own.exitCode, 0);
        EXPECT_THAT(own.output, HasSubstr(command));
    }
    EXPECT_THAT(home.run({"page", "--help"}).output, HasSubstr("--page"));
    // Help opens nothing.
    EXPECT_FALSE(std::filesystem::exists(home.path(".local")));
}

TEST(StartTest, aWrongCommandLineEndsWithTwoAndOneLine) {
    const Home home;
    for (const Arguments& arguments : std::vector<Arguments>{{},
                                                             {"nonsense"},
                                                             {"serve", "x"},
                                                             {"ls", "a", "b"},
                                                             {"info"},
                                                             {"id"},
                                                             {"path"},
                                                             {"page"},
                                                             {"page", "root", "--page"},
                                                             {"ls", "--nonsense"},
                                                             {"--root"},
                                                             {"--root", "", "ls"},
                                                             {"--state=", "ls"},
                                                             {"doctor", "x"},
                                                             {"ls", "info", "x"}}) {
        const ChildResult result = home.run(arguments);
        EXPECT_EQ(result.exitCode, 2) << ::testing::PrintToString(arguments);
        EXPECT_EQ(result.output, "");
        EXPECT_TRUE(result.errors.starts_with("marrowdale: ")) << result.errors;
        EXPECT_EQ(std::ranges::count(result.errors, '\n'), 1) << result.errors;
        EXPECT_EQ(home.error(arguments, 2)["code"], 2);
    }
    EXPECT_FALSE(std::filesystem::exists(home.path(".local")));
}

TEST(StartTest, whatIsWrongWithACommandLineIsToldInWords) {
    const Home home;
    const std::vector<std::pair<Arguments, std::string>> expected{
        {{}, "which command?"},
        {{"--root", home.root()}, "which command?"},
        {{"--root"}, "--root wants a value"},
        {{"ls", "--state"}, "--state wants a value"},
        {{"page", "root", "--page"}, "--page wants a value"},
        {{"--", "ls"}, "the command comes before \"--\""},
        {{"nonsense"}, "no such command: nonsense"},
        {{"--nonsense"}, "no such option: --nonsense"},
        {{"ls", "-x"}, "no such option: -x"},
        {{"ls", "a", "b"}, "one argument too many: b"},
        {{"info"}, "ITEM is required"}};
    for (const auto& [arguments, words] : expected) {
        EXPECT_EQ(home.run(arguments).errors,
                  "marrowdale: " + words + " (see marrowdale --help)\n");
    }
}

TEST(StartTest, ofAnOptionThatIsGivenTwiceTheLastCounts) {
    const Home home;
    EXPECT_EQ(
        home.line({"--root", home.path("none"), "info", "root", "--root", home.root()})["path"],
        home.root());
}

TEST(StartTest, helpTellsDefaultsInWords) {
    const Home home;
    EXPECT_THAT(home.run({"ls", "--help"}).output,
                HasSubstr("\n  ITEM                        A path, a word, or an identifier "
                          "(default: root)\n"));
    EXPECT_THAT(home.run({"page", "--help"}).output,
                HasSubstr("\n  --page TOKEN                Where to go on: a token, or one of: "
                          "date, name (default: name)\n"));
}

TEST(StartTest, optionsOfTheProgramAreTakenAfterTheCommandToo) {
    const Home home;
    writeFile(home.document("a"), "");
    const ChildResult result = home.run({"ls", "--json", "--root", home.root()});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(parsedLines(result.output).size(), 1U);
}

TEST(StartTest, theDefaultRootIsMadeWhenMissing) {
    const Home home;
    std::filesystem::remove(home.root());
    ChildOptions options = home.command({"ls"});
    options.workingFolder = "/";
    EXPECT_EQ(runChild(options).exitCode, 0);
    EXPECT_TRUE(std::filesystem::is_directory(home.root()));
}

TEST(StartTest, aMissingRootEndsWithThree) {
    const Home home;
    const Json error = home.error({"--root", home.path("none"), "ls"}, 3);
    EXPECT_EQ(error["name"], "posix");
    EXPECT_EQ(error["code"], ENOENT);
    const ChildResult result = home.run({"--root", home.path("none"), "ls"});
    EXPECT_EQ(result.exitCode, 3);
    EXPECT_EQ(result.errors, "marrowdale: can't serve the storage root \"" + home.path("none") +
                                 "\": No such file or directory\n");
}

TEST(StartTest, aRootThatIsAFileEndsWithThree) {
    const Home home;
    writeFile(home.path("file"), "");
    EXPECT_EQ(home.error({"--root", home.path("file"), "ls"}, 3)["code"], ENOTDIR);
}

TEST(StartTest, anUnreadableRootEndsWithThree) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permission bits don't bind root");
    }
    const Home home;
    makeFolder(home.path("closed"));
    ASSERT_EQ(::chmod(home.path("closed").c_str(), 0), 0);
    EXPECT_EQ(home.error({"--root", home.path("closed"), "ls"}, 3)["code"], EACCES);
}

TEST(StartTest, aRootBelowAnotherDocumentsFolderEndsWithThree) {
    const Home home;
    makeFolder(home.document("sub/Documents"));
    for (const char* root : {"sub", "sub/Documents"}) {
        const Json error = home.error({"--root", home.document(root), "ls"}, 3);
        EXPECT_EQ(error["name"], "other");
        EXPECT_THAT(error["message"].get<std::string>(), HasSubstr("\"Documents\""));
    }
}

TEST(StartTest, aRootOfAnotherNameIsServedWithoutATrash) {
    const Home home;
    makeFolder(home.path("Papers"));
    writeFile(home.path("Papers/a.txt"), "");
    const Arguments root{"--root", home.path("Papers")};
    const auto items = home.lines({"--root", home.path("Papers"), "ls"});
    EXPECT_THAT(field(items, "filename"), ::testing::ElementsAre("a.txt"));
    bool isTold = false;
    for (const Json& finding : home.lines({"--root", home.path("Papers"), "doctor"})) {
        isTold = isTold || (finding["finding"] == "trash" && finding["status"] == "note");
    }
    EXPECT_TRUE(isTold);
}

TEST(StartTest, aStateFolderThatCanNotBeMadeEndsWithThree) {
    const Home home;
    writeFile(home.path("file"), "");
    const Json error = home.error({"--state", home.path("file/state"), "ls"}, 3);
    EXPECT_EQ(error["name"], "posix");
    EXPECT_EQ(home.error({"--state", "/proc/none", "ls"}, 3)["name"], "posix");
}

TEST(StartTest, withoutAHomeTheFoldersMustBeNamed) {
    const Home home;
    ChildOptions options = home.command({"ls"});
    options.variables.erase("HOME");
    EXPECT_EQ(runChild(options).exitCode, 3);
    options = home.command({"--root", home.root(), "--state", home.path("state"), "ls"});
    options.variables.erase("HOME");
    EXPECT_EQ(runChild(options).exitCode, 0);
}

TEST(StartTest, theEnvironmentNamesTheFolders) {
    const Home home;
    makeFolder(home.path("Papers"));
    writeFile(home.path("Papers/a.txt"), "");
    ChildOptions options = home.command({"ls", "--json"});
    options.variables["MARROWDALE_ROOT"] = "../Papers";  // relative to the working folder
    options.variables["MARROWDALE_STATE"] = home.path("s");
    const ChildResult result = runChild(options);
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_EQ(parsedLines(result.output).at(0)["filename"], "a.txt");
    EXPECT_TRUE(std::filesystem::exists(home.path("s")));
    EXPECT_FALSE(std::filesystem::exists(home.path(".local")));
}

TEST(StartTest, whatAProviderErrorIsToldPeopleIsOneLine) {
    const Home home;
    const ChildResult result = home.run({"path", "did=1\n2"});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_TRUE(result.errors.ends_with("marrowdale: no such item: did=1\\n2\n")) << result.errors;
}

TEST(StartTest, verboseTellsTheSectionsOnStandardError) {
    const Home home;
    const ChildResult result = home.run({"--verbose", "--json", "ls"});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_THAT(result.errors, HasSubstr("[DEBUG] ┏"));
    EXPECT_THAT(result.errors, HasSubstr("[DEBUG] ┗"));
    EXPECT_THAT(result.errors,
                HasSubstr("auto notify changes on VantrelWorkingSetContainerItemIdentifier at "
                          "startup"));
    EXPECT_EQ(result.output, "");
}

}  // namespace
}  // namespace marrowdale::tests
