#include <chrono>
#include <string>

#include <fmt/format.h>

#include "host/daemon/Doctor.h"
#include "host/daemon/ReadableSize.h"

namespace marrowdale::host {

namespace {

using native::Retention;
using native::StoreReport;

std::string boundsOf(const Retention& retention) {
    const auto days = std::chrono::duration_cast<std::chrono::days>(retention.age).count();
    return fmt::format("kept: {} days and {} events, in {} at most", days, retention.events,
                       readableSize(retention.bytes));
}

Finding historyFinding(const StoreReport& report, const Retention& retention) {
    const std::string bounds = boundsOf(retention);
    if (report.events == 0) {
        return {"history",
                FindingStatus::ok,
                fmt::format("no events yet, {} on disk; the next one is number {}; {}",
                            readableSize(report.historyBytes), raw(report.oldestEventID), bounds),
                {}};
    }
    return {"history",
            FindingStatus::ok,
            fmt::format("{} events in {}; the oldest is number {}, begun at {}; {}", report.events,
                        readableSize(report.historyBytes), raw(report.oldestEventID),
                        report.oldestEventDate.rfc3339(), bounds),
            {}};
}

Finding historyProblemFinding(const StoreReport& report) {
    if (report.historyProblem.empty()) {
        return {"history-problem", FindingStatus::ok, "nothing is wrong with the history", {}};
    }
    return {"history-problem", FindingStatus::note,
            "older history is gone: " + report.historyProblem,
            "Pages from before that have expired; their holders start over. Look after the disk."};
}

Finding reconcileFinding(const StoreReport& report) {
    using Milliseconds = std::chrono::duration<double, std::milli>;
    const auto& last = report.reconcile;
    return {"reconcile",
            FindingStatus::ok,
            fmt::format("looked at {} entries in {} folders in {:.1f} ms, until {}; {} differed",
                        last.entries, last.folders, Milliseconds(last.duration).count(),
                        last.finished.rfc3339(), last.differences),
            {}};
}

Finding rootPlaceFinding(const StoreReport& report) {
    const auto& problem = report.recorder.rootProblem;
    if (!problem) {
        return {"root-place", FindingStatus::ok, "the storage root stands where it stood", {}};
    }
    return {"root-place", FindingStatus::problem,
            "the storage root does not stand where it stood: " + problem->description(),
            "Put it back, or start again with the folder that is to be served; nothing is recorded "
            "until then."};
}

}  // namespace

std::vector<Finding> historyFindings(const StoreReport& report, const Retention& retention) {
    return {historyFinding(report, retention), historyProblemFinding(report),
            reconcileFinding(report), rootPlaceFinding(report)};
}

}  // namespace marrowdale::host
