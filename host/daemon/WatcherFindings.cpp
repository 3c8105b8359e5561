#include <cstdint>
#include <fcntl.h>
#include <optional>
#include <string>

#include <fmt/format.h>

#include "host/daemon/Doctor.h"
#include "platform/linux/events/KernelLimit.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

using native::RecorderReport;
using native::Watcher;

constexpr const char* raiseMarks =
    "Raise fs.fanotify.max_user_marks or fs.inotify.max_user_watches with sysctl.";

std::string shown(std::uint64_t limit) {
    return limit == 0 ? "unknown" : std::to_string(limit);
}

Finding watcherFinding(const RecorderReport& recorder) {
    if (!recorder.watcher) {
        return {"watcher", FindingStatus::problem,
                "none: " + (recorder.problem.empty() ? "unknown why" : recorder.problem),
                "The whole tree is looked at whenever something is asked; keep the documents on a "
                "local file system, such as ext4, xfs, btrfs or tmpfs."};
    }
    const Watcher::Status& watcher = *recorder.watcher;
    Finding finding{"watcher", FindingStatus::ok, watcher.reason, {}};
    if (!recorder.isLive) {
        finding.message =
            "commands look at the tree when they start; what listens would use " + watcher.reason;
    }
    if (watcher.kind == Watcher::Kind::inotify) {
        finding.status = FindingStatus::note;
        finding.advice =
            "fanotify costs less; it needs Linux 5.17 or later and a file system with handles, "
            "such as ext4, xfs, btrfs or tmpfs.";
    }
    return finding;
}

Finding limitsFinding() {
    const auto limit = [](const char* name) { return shown(native::kernelLimit(name)); };
    return {"limits",
            FindingStatus::ok,
            fmt::format("fanotify: {} marks and {} groups a user, {} queued events each; inotify: "
                        "{} watches and {} instances a user, {} queued events each",
                        limit("fanotify/max_user_marks"), limit("fanotify/max_user_groups"),
                        limit("fanotify/max_queued_events"), limit("inotify/max_user_watches"),
                        limit("inotify/max_user_instances"), limit("inotify/max_queued_events")),
            {}};
}

Finding marksFinding(const RecorderReport& recorder, std::uint64_t folders) {
    const Watcher::Status& watcher = *recorder.watcher;
    const std::uint64_t marks = recorder.isLive ? watcher.marks : folders;
    Finding finding{
        "marks",
        FindingStatus::ok,
        fmt::format("{} {} of the {} that this user may have in all his programs",
                    recorder.isLive ? "watched are" : "to listen would take one for each folder,",
                    marks, shown(watcher.marksLimit)),
        {}};
    // Other programs of the user's need some too.
    if (watcher.marksLimit != 0 && marks > watcher.marksLimit - watcher.marksLimit / 5) {
        finding.status = FindingStatus::note;
        finding.advice = raiseMarks;
    }
    return finding;
}

Finding unwatchedFinding(const RecorderReport& recorder) {
    if (recorder.unwatchedFolders == 0) {
        return {"unwatched-folders", FindingStatus::ok, "no folder is left out of listening", {}};
    }
    return {"unwatched-folders", FindingStatus::note,
            fmt::format("{} folders can't be watched and are listed again at each request: {}",
                        recorder.unwatchedFolders, recorder.problem),
            raiseMarks};
}

Finding overflowFinding(const RecorderReport& recorder) {
    const Watcher::Status& watcher = *recorder.watcher;
    const std::string queue =
        fmt::format("the kernel keeps {} events until they are read", shown(watcher.queueLimit));
    if (!recorder.isLive) {
        return {"overflow", FindingStatus::ok, queue + "; nothing listens in this run", {}};
    }
    if (watcher.overflows == 0 && !recorder.lastOverflow) {
        return {"overflow",
                FindingStatus::ok,
                fmt::format("{}; {} were read, none was lost", queue, watcher.events),
                {}};
    }
    return {"overflow", FindingStatus::note,
            fmt::format("{}; that was too few {} times in this run, the last time at {}; the whole "
                        "tree was looked at instead",
                        queue, watcher.overflows,
                        recorder.lastOverflow ? recorder.lastOverflow->rfc3339() : "unknown"),
            "Raise fs.fanotify.max_queued_events or fs.inotify.max_queued_events with sysctl."};
}

}  // namespace

RecorderReport triedRecorder(const std::string& rootPath) {
    RecorderReport report;
    const native::UniqueFD root(::open(rootPath.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    const auto watcher = native::makeWatcher(root.get());
    if (watcher) {
        report.watcher = (*watcher)->status();
    } else {
        report.problem = watcher.error().description();
    }
    return report;
}

std::vector<Finding> listeningFindings() {
    return {{"watcher", FindingStatus::note, "unknown without a storage root", {}},
            limitsFinding()};
}

std::vector<Finding> listeningFindings(const RecorderReport& recorder,
                                       std::optional<std::uint64_t> folders) {
    std::vector<Finding> findings{watcherFinding(recorder), limitsFinding()};
    if (recorder.watcher) {
        if (recorder.isLive || folders) {
            findings.push_back(marksFinding(recorder, folders.value_or(0)));
        }
        findings.push_back(unwatchedFinding(recorder));
        findings.push_back(overflowFinding(recorder));
    }
    return findings;
}

}  // namespace marrowdale::host
