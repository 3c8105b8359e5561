#include <gmock/gmock.h>

#include "host/daemon/Doctor.h"
#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale::host {
namespace {

using native::RecorderReport;
using native::Watcher;
using ::testing::HasSubstr;

Finding named(const std::vector<Finding>& findings, std::string_view name) {
    for (const Finding& finding : findings) {
        if (finding.name == name) {
            return finding;
        }
    }
    ADD_FAILURE() << "no finding " << name;
    return {};
}

std::vector<std::string> names(const std::vector<Finding>& findings) {
    std::vector<std::string> all;
    for (const Finding& finding : findings) {
        all.push_back(finding.name);
    }
    return all;
}

RecorderReport listening() {
    RecorderReport report;
    report.isLive = true;
    report.watcher = Watcher::Status{.kind = Watcher::Kind::fanotify,
                                     .reason = "fanotify, because it works",
                                     .marks = 12,
                                     .marksLimit = 100,
                                     .queueLimit = 16,
                                     .events = 7,
                                     .overflows = 0};
    return report;
}

TEST(WatcherFindingsTest, aRecorderThatListensTellsHow) {
    const auto findings = listeningFindings(listening(), 11);
    EXPECT_THAT(names(findings), ::testing::ElementsAre("watcher", "limits", "marks",
                                                        "unwatched-folders", "overflow"));
    for (const Finding& finding : findings) {
        EXPECT_EQ(finding.status, FindingStatus::ok) << finding.name;
        EXPECT_EQ(finding.advice, "") << finding.name;
    }
    EXPECT_EQ(named(findings, "watcher").message, "fanotify, because it works");
    EXPECT_THAT(named(findings, "marks").message, HasSubstr("12 of the 100"));
    EXPECT_THAT(named(findings, "overflow").message, HasSubstr("keeps 16 events"));
    EXPECT_THAT(named(findings, "overflow").message, HasSubstr("7 were read"));
}

TEST(WatcherFindingsTest, whoDoesNotListenIsToldWhatWould) {
    RecorderReport report = listening();
    report.isLive = false;
    const auto findings = listeningFindings(report, 11);
    EXPECT_THAT(named(findings, "watcher").message,
                HasSubstr("would use fanotify, because it works"));
    EXPECT_THAT(named(findings, "marks").message, HasSubstr("11 of the 100"));
    EXPECT_THAT(named(findings, "overflow").message, HasSubstr("nothing listens in this run"));
    EXPECT_THAT(names(listeningFindings(report, std::nullopt)),
                ::testing::Not(::testing::Contains("marks")));
}

TEST(WatcherFindingsTest, theSecondChoiceIsANote) {
    RecorderReport report = listening();
    report.watcher->kind = Watcher::Kind::inotify;
    const Finding watcher = named(listeningFindings(report, 11), "watcher");
    EXPECT_EQ(watcher.status, FindingStatus::note);
    EXPECT_FALSE(watcher.advice.empty());
}

TEST(WatcherFindingsTest, whereNothingListensTheReasonIsTold) {
    RecorderReport report;
    report.problem = "neither works here";
    const auto findings = listeningFindings(report, 11);
    EXPECT_THAT(names(findings), ::testing::ElementsAre("watcher", "limits"));
    EXPECT_EQ(findings[0].status, FindingStatus::problem);
    EXPECT_THAT(findings[0].message, HasSubstr("neither works here"));
    EXPECT_FALSE(findings[0].advice.empty());
}

TEST(WatcherFindingsTest, withoutARootThereIsNothingToTry) {
    const auto findings = listeningFindings();
    EXPECT_THAT(names(findings), ::testing::ElementsAre("watcher", "limits"));
    EXPECT_EQ(findings[0].status, FindingStatus::note);
}

TEST(WatcherFindingsTest, marksThatRunShortAreANote) {
    RecorderReport report = listening();
    report.watcher->marks = 80;
    EXPECT_EQ(named(listeningFindings(report, 0), "marks").status, FindingStatus::ok);
    report.watcher->marks = 81;
    EXPECT_EQ(named(listeningFindings(report, 0), "marks").status, FindingStatus::note);
    EXPECT_FALSE(named(listeningFindings(report, 0), "marks").advice.empty());
    report.watcher->marksLimit = 0;
    EXPECT_EQ(named(listeningFindings(report, 0), "marks").status, FindingStatus::ok);
    EXPECT_THAT(named(listeningFindings(report, 0), "marks").message, HasSubstr("unknown"));
}

TEST(WatcherFindingsTest, foldersThatAreNotWatchedAreCountedWithTheReason) {
    RecorderReport report = listening();
    report.unwatchedFolders = 3;
    report.problem = "no room for marks";
    const Finding finding = named(listeningFindings(report, 11), "unwatched-folders");
    EXPECT_EQ(finding.status, FindingStatus::note);
    EXPECT_THAT(finding.message, HasSubstr("3 folders"));
    EXPECT_THAT(finding.message, HasSubstr("no room for marks"));
    EXPECT_FALSE(finding.advice.empty());
}

TEST(WatcherFindingsTest, anOverflowIsToldWithItsDate) {
    RecorderReport report = listening();
    report.watcher->overflows = 2;
    report.lastOverflow = Date{0, 5};
    const Finding finding = named(listeningFindings(report, 11), "overflow");
    EXPECT_EQ(finding.status, FindingStatus::note);
    EXPECT_THAT(finding.message, HasSubstr("2 times"));
    EXPECT_THAT(finding.message, HasSubstr("1970-01-01T00:00:00.000000005Z"));
    EXPECT_FALSE(finding.advice.empty());
}

TEST(WatcherFindingsTest, aRootIsTriedAndLetGoOf) {
    const TemporaryDirectory root;
    const RecorderReport report = triedRecorder(root.path());
    EXPECT_FALSE(report.isLive);
    ASSERT_TRUE(report.watcher.has_value()) << report.problem;
    EXPECT_EQ(report.watcher->marks, 0U);
    EXPECT_FALSE(report.watcher->reason.empty());
    const RecorderReport missing = triedRecorder(root.path("none"));
    EXPECT_FALSE(missing.watcher.has_value());
    EXPECT_FALSE(missing.problem.empty());
}

}  // namespace
}  // namespace marrowdale::host
