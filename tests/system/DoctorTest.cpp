#include <filesystem>
#include <set>
#include <sys/stat.h>

#include <gmock/gmock.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

class DoctorTest : public SystemTest {};

MARROWDALE_ON_EACH_FILE_SYSTEM(DoctorTest);

Json finding(const std::vector<Json>& findings, const std::string& name) {
    for (const Json& one : findings) {
        if (one.at("finding") == name) {
            return one;
        }
    }
    return {};
}

std::string onlyStoreIn(const std::string& stateFolder) {
    std::string found;
    for (const auto& entry : std::filesystem::directory_iterator(stateFolder)) {
        if (entry.path().filename().string().starts_with("store-")) {
            EXPECT_EQ(found, "");
            found = entry.path();
        }
    }
    return found;
}

TEST_P(DoctorTest, eachFindingIsALineWithNameStatusAndMessage) {
    writeFile(home_.document("a.txt"), "x");
    const auto findings = home_.lines({"doctor"});
    std::set<std::string> names;
    for (const Json& one : findings) {
        EXPECT_TRUE(names.insert(one.at("finding")).second) << one;
        EXPECT_THAT((std::set<std::string>{"ok", "note", "problem"}),
                    ::testing::Contains(text(one, "status")));
        EXPECT_FALSE(text(one, "message").empty());
    }
    for (const char* name : {"root",        "trash",
                             "file-system", "extended-attributes",
                             "state",       "types",
                             "watcher",     "limits",
                             "store",       "stores",
                             "journal",     "memory",
                             "history",     "rebuild",
                             "reconcile",   "mounts",
                             "libraries",   "unreadable-folders",
                             "marks",       "unwatched-folders",
                             "overflow",    "history-problem",
                             "root-place"}) {
        EXPECT_TRUE(names.contains(name)) << name;
    }
    EXPECT_EQ(finding(findings, "trash")["status"], "ok");
    EXPECT_EQ(finding(findings, "extended-attributes")["status"],
              keepsUserAttributes(home_.root()) ? "ok" : "problem");
}

TEST_P(DoctorTest, thereIsAdviceWhereSomethingCanBeDone) {
    makeFolder(home_.path("Papers"));
    const auto findings = home_.lines({"--root", home_.path("Papers"), "doctor"});
    EXPECT_EQ(finding(findings, "trash")["status"], "note");
    EXPECT_FALSE(finding(findings, "trash")["advice"].get<std::string>().empty());
}

TEST_P(DoctorTest, whereTheStoreCanNotBeOpenedTheRestIsStillTold) {
    writeFile(home_.path("file"), "");
    const ChildResult result = home_.run({"--json", "--state", home_.path("file/state"), "doctor"});
    EXPECT_EQ(result.exitCode, 3);
    const auto findings = parsedLines(result.output);
    EXPECT_EQ(finding(findings, "root")["status"], "ok");
    EXPECT_EQ(finding(findings, "provider")["status"], "problem");
    EXPECT_EQ(parsedLines(result.errors).size(), 1U);
}

TEST_P(DoctorTest, withoutARootWhatNeedsNoneIsStillTold) {
    writeFile(home_.path("file"), "");
    makeFolder(home_.document("sub"));
    std::vector<std::string> roots{home_.path("none"), home_.path("file"), home_.document("sub")};
    if (!runsAsRoot()) {  // whom permission bits don't bind
        makeFolder(home_.path("closed"));
        ASSERT_EQ(::chmod(home_.path("closed").c_str(), 0), 0);
        roots.push_back(home_.path("closed"));
    }
    for (const std::string& root : roots) {
        const ChildResult result = home_.run({"--json", "--root", root, "doctor"});
        EXPECT_EQ(result.exitCode, 3) << root;
        const auto findings = parsedLines(result.output);
        EXPECT_THAT(field(findings, "finding"),
                    ::testing::ElementsAre("root", "state", "types", "watcher", "limits"));
        EXPECT_EQ(finding(findings, "root")["status"], "problem") << root;
        EXPECT_EQ(finding(findings, "state")["status"].is_string(), true);
        ASSERT_EQ(parsedLines(result.errors).size(), 1U);
        EXPECT_EQ(parsedLines(result.errors)[0]["error"]["message"],
                  finding(findings, "root")["message"]);
    }
}

TEST_P(DoctorTest, aDamagedStoreIsToldOfWithItsReason) {
    writeFile(home_.document("a.txt"), "x");
    EXPECT_EQ(home_.lines({"ls"}).size(), 1U);
    EXPECT_EQ(finding(home_.lines({"doctor"}), "rebuild")["status"], "ok");
    const std::string head = onlyStoreIn(home_.path(".local/state/marrowdale")) + "/head";
    std::string bytes = readFile(head);
    ASSERT_FALSE(bytes.empty());
    bytes[bytes.size() / 2] = static_cast<char>(bytes[bytes.size() / 2] ^ 1);
    writeFile(head, bytes);
    const Json rebuild = finding(home_.lines({"doctor"}), "rebuild");
    EXPECT_EQ(rebuild["status"], "note");
    EXPECT_FALSE(rebuild["advice"].get<std::string>().empty());
    EXPECT_EQ(home_.lines({"ls"}).size(), 1U);
}

TEST_P(DoctorTest, theStoresOfAllRootsAreCounted) {
    EXPECT_EQ(finding(home_.lines({"doctor"}), "stores")["status"], "ok");
    makeFolder(home_.path("Papers"));
    const Json stores = finding(home_.lines({"--root", home_.path("Papers"), "doctor"}), "stores");
    EXPECT_EQ(stores["status"], "note");
    EXPECT_THAT(text(stores, "message"), ::testing::HasSubstr("2 stores"));
    EXPECT_THAT(text(stores, "message"), ::testing::HasSubstr(home_.root()));
    EXPECT_FALSE(text(stores, "advice").empty());
}

TEST_P(DoctorTest, whatWouldListenIsTriedOnTheRoot) {
    makeFolder(home_.document("one/two"));
    const auto findings = home_.lines({"doctor"});
    const Json watcher = finding(findings, "watcher");
    EXPECT_EQ(watcher["status"], "ok");
    EXPECT_THAT(text(watcher, "message"), ::testing::HasSubstr("would use fanotify"));
    EXPECT_THAT(text(finding(findings, "marks"), "message"), ::testing::HasSubstr(" 3 of "));
}

TEST_P(DoctorTest, theHistoryIsCountedFromItsOldestEvent) {
    EXPECT_THAT(text(finding(home_.lines({"doctor"}), "history"), "message"),
                ::testing::StartsWith("no events yet"));
    writeFile(home_.document("a.txt"), "x");
    const auto findings = home_.lines({"doctor"});
    EXPECT_THAT(text(finding(findings, "history"), "message"), ::testing::HasSubstr("events in"));
    EXPECT_THAT(text(finding(findings, "history"), "message"),
                ::testing::HasSubstr("the oldest is number"));
    EXPECT_EQ(finding(findings, "history-problem")["status"], "ok");
    EXPECT_EQ(finding(findings, "root-place")["status"], "ok");
}

TEST_P(DoctorTest, itLeavesNothingInTheDocuments) {
    const auto changed = [this] {
        return home_.line({"info", "root"})["contentModificationDate"].get<std::string>();
    };
    const std::string before = changed();
    EXPECT_THAT(home_.lines({"doctor"}), ::testing::Not(::testing::IsEmpty()));
    EXPECT_EQ(changed(), before);
    EXPECT_THAT(home_.lines({"ls"}), ::testing::IsEmpty());
}

}  // namespace
}  // namespace marrowdale::tests
