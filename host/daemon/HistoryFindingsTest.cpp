#include <cerrno>

#include <gmock/gmock.h>

#include "host/daemon/Doctor.h"

namespace marrowdale::host {
namespace {

using ::testing::HasSubstr;

// By the order in which they are told.
enum Place : std::size_t { history, historyProblem, reconcile, rootPlace };

Finding one(Place place, const native::StoreReport& report) {
    const native::Retention retention{
        .age = std::chrono::days(7), .events = 1234, .bytes = 5'000'000};
    const auto findings = historyFindings(report, retention);
    EXPECT_EQ(findings.size(), 4U);
    return findings.at(place);
}

TEST(HistoryFindingsTest, theOldestEventIsToldWithItsDateAndTheBounds) {
    native::StoreReport report;
    report.events = 42;
    report.oldestEventID = EventID{100};
    report.oldestEventDate = Date{0, 0};
    report.historyBytes = 3'000;
    const Finding finding = one(history, report);
    EXPECT_EQ(finding.name, "history");
    EXPECT_EQ(finding.status, FindingStatus::ok);
    for (const char* words : {"42 events", "3.0 kB", "number 100", "1970-01-01T00:00:00", "7 days",
                              "1234 events", "5.0 MB"}) {
        EXPECT_THAT(finding.message, HasSubstr(words));
    }
}

TEST(HistoryFindingsTest, aHistoryWithoutEventsNamesNoOldestOne) {
    native::StoreReport report;
    report.oldestEventID = EventID{101};
    const Finding finding = one(history, report);
    EXPECT_THAT(finding.message, HasSubstr("no events yet"));
    EXPECT_THAT(finding.message, HasSubstr("the next one is number 101"));
}

TEST(HistoryFindingsTest, whatIsWrongWithTheHistoryIsTold) {
    native::StoreReport report;
    EXPECT_EQ(one(historyProblem, report).name, "history-problem");
    EXPECT_EQ(one(historyProblem, report).status, FindingStatus::ok);
    report.historyProblem = "a segment is cut";
    EXPECT_EQ(one(historyProblem, report).status, FindingStatus::note);
    EXPECT_THAT(one(historyProblem, report).message, HasSubstr("a segment is cut"));
    EXPECT_FALSE(one(historyProblem, report).advice.empty());
}

TEST(HistoryFindingsTest, theLastLookAtTheTreeIsTold) {
    native::StoreReport report;
    report.reconcile.finished = Date{60, 0};
    report.reconcile.duration = std::chrono::microseconds(2500);
    report.reconcile.entries = 30;
    report.reconcile.folders = 4;
    report.reconcile.differences = 5;
    EXPECT_EQ(one(reconcile, report).name, "reconcile");
    EXPECT_EQ(one(reconcile, report).message,
              "looked at 30 entries in 4 folders in 2.5 ms, until 1970-01-01T00:01:00.000000000Z; "
              "5 differed");
}

TEST(HistoryFindingsTest, aRootThatWasMovedIsAProblem) {
    native::StoreReport report;
    EXPECT_EQ(one(rootPlace, report).name, "root-place");
    EXPECT_EQ(one(rootPlace, report).status, FindingStatus::ok);
    report.recorder.rootProblem = errorWithPOSIXCode(ESTALE, "look at", "/served");
    EXPECT_EQ(one(rootPlace, report).status, FindingStatus::problem);
    EXPECT_THAT(one(rootPlace, report).message, HasSubstr("/served"));
    EXPECT_FALSE(one(rootPlace, report).advice.empty());
}

}  // namespace
}  // namespace marrowdale::host
