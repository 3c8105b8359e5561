#include <algorithm>
#include <cerrno>

#include <fmt/format.h>

#include "host/daemon/Doctor.h"
#include "host/daemon/ReadableSize.h"

namespace marrowdale::host {

namespace {

using native::StoreReport;

constexpr std::size_t mostPathsNamed = 5;

Finding journalFinding(const StoreReport& report) {
    const std::string snapshot = report.snapshotBytes == 0
                                     ? "no snapshot yet"
                                     : readableSize(report.snapshotBytes) + " of snapshot";
    return {"journal",
            FindingStatus::ok,
            fmt::format("{} entries, {} of them documents with an identifier; on disk {} of log "
                        "and {}",
                        report.entries, report.documents, readableSize(report.logBytes), snapshot),
            {}};
}

Finding memoryFinding(const StoreReport& report) {
    // What a small index takes says nothing of an entry: tables begin at some size.
    constexpr std::uint64_t many = 100'000;
    std::string message = "the index takes " + readableSize(report.memory);
    if (report.entries >= many) {
        message += fmt::format(" ({} bytes an entry)", report.memory / report.entries);
    }
    return {"memory", FindingStatus::ok, std::move(message), {}};
}

Finding identityFinding(const StoreReport& report) {
    return {"store",
            FindingStatus::ok,
            fmt::format("UUID {}, made {}, last event {}", report.uuid.text(),
                        report.created.rfc3339(), raw(report.lastEventID)),
            {}};
}

Finding identifiersFinding(const StoreReport& report) {
    constexpr std::uint64_t few = 100'000'000;
    Finding finding{"identifiers",
                    FindingStatus::ok,
                    fmt::format("{} document identifiers used, {} left", report.documentIDsUsed,
                                report.documentIDsLeft),
                    {}};
    if (report.documentIDsLeft < few) {
        finding.status = FindingStatus::note;
        finding.advice =
            "When none is left, new documents are refused; begin a new state folder "
            "before that.";
    }
    return finding;
}

Finding rebuildFinding(const StoreReport& report) {
    if (report.rebuildReason.empty()) {
        return {"rebuild", FindingStatus::ok, "this store has replaced no earlier one", {}};
    }
    std::string message = "the store was made anew: " + report.rebuildReason;
    if (!report.damagedFolder.empty()) {
        message += "; the earlier one is in " + report.damagedFolder;
    }
    return {"rebuild", FindingStatus::note, std::move(message),
            "Identifiers and pages handed out before that mean nothing now."};
}

Finding witnessFinding(const StoreReport& report) {
    if (report.witness.empty()) {
        return {"witness",
                FindingStatus::ok,
                "a state folder restored from a back-up would be noticed",
                {}};
    }
    return {"witness", FindingStatus::note,
            "a state folder restored from a back-up would not be noticed: " + report.witness,
            "Make the cache folder ($XDG_CACHE_HOME/marrowdale or ~/.cache/marrowdale) writable."};
}

Finding writingFinding(const StoreReport& report) {
    if (!report.writeError) {
        return {"writing", FindingStatus::ok, "the store can be written", {}};
    }
    return {"writing", FindingStatus::problem,
            "the store can't be written: " + report.writeError->description(),
            "Known documents are served, new ones get no identifier until this is mended."};
}

std::string firstOf(const std::vector<std::string>& paths, std::uint64_t count) {
    std::string text;
    for (std::size_t i = 0; i < std::min(paths.size(), mostPathsNamed); ++i) {
        text += (text.empty() ? "" : ", ") + paths[i];
    }
    return count > mostPathsNamed ? text + ", …" : text;
}

Finding pathsFinding(std::string name, std::string_view what, const std::vector<std::string>& paths,
                     std::uint64_t count, std::string advice) {
    if (count == 0) {
        return {std::move(name), FindingStatus::ok, fmt::format("no {}", what), {}};
    }
    return {std::move(name), FindingStatus::note,
            fmt::format("{} {}: {}", count, what, firstOf(paths, count)), std::move(advice)};
}

// Reports name what lies below the root by its path from there, what lies elsewhere by its whole
// path.
std::vector<std::string> absolutePaths(const StoreReport& report,
                                       const std::vector<std::string>& paths) {
    std::vector<std::string> absolute;
    for (const std::string& path : paths) {
        absolute.push_back(path.empty()            ? report.rootPath
                           : path.starts_with('/') ? path
                                                   : report.rootPath + "/" + path);
    }
    return absolute;
}

// What the walk met on other file systems, and what is mounted from the root's own.
Finding mountsFinding(const StoreReport& report, const std::vector<std::string>& mounts) {
    std::vector<std::string> paths = absolutePaths(report, report.reconcile.skippedMounts);
    std::uint64_t count = report.reconcile.skippedMountCount;
    for (const std::string& mount : mounts) {
        if (std::ranges::find(paths, mount) == paths.end()) {
            paths.push_back(mount);
            ++count;
        }
    }
    return pathsFinding("mounts", "other file systems or mounted folders skipped", paths, count,
                        "Everything served lies on one volume; name another root to serve these.");
}

// One that is not there has nothing to record.
Finding librariesFinding(const StoreReport& report) {
    std::size_t recorded = 0;
    std::vector<std::string> refused;
    for (const auto& library : report.libraries) {
        recorded += library.problem ? 0U : 1U;
        if (library.problem && library.problem->code != ENOENT) {
            refused.push_back(library.path + " (" + library.problem->description() + ")");
        }
    }
    if (refused.empty()) {
        return {"libraries",
                FindingStatus::ok,
                fmt::format("the documents of {} applications are recorded", recorded),
                {}};
    }
    return {"libraries", FindingStatus::note,
            fmt::format("{} folders of applications can't be recorded: {}", refused.size(),
                        firstOf(refused, refused.size())),
            "Changes in them are not told; each is looked for again and again."};
}

// One state folder serves several root folders, each with a store of its own.
Finding storesFinding(const StoreReport& report) {
    if (report.stores.size() <= 1) {
        return {"stores",
                FindingStatus::ok,
                fmt::format("{} holds this store only", report.stateFolder),
                {}};
    }
    std::uint64_t bytes = 0;
    std::vector<std::string> roots;
    for (const auto& store : report.stores) {
        bytes += store.bytes;
        roots.push_back(fmt::format("{} ({}, {})",
                                    store.rootPath.empty() ? "unknown" : store.rootPath,
                                    store.folder, readableSize(store.bytes)));
    }
    return {
        "stores", FindingStatus::note,
        fmt::format("{} stores in {}, {} in all, for the root folders: {}", report.stores.size(),
                    report.stateFolder, readableSize(bytes), firstOf(roots, roots.size())),
        "The store of a root folder that is gone for good can be removed."};
}

}  // namespace

std::vector<Finding> storeFindings(const StoreReport& report,
                                   const std::vector<std::string>& mounts) {
    const auto& last = report.reconcile;
    return {identityFinding(report),
            storesFinding(report),
            journalFinding(report),
            memoryFinding(report),
            identifiersFinding(report),
            rebuildFinding(report),
            witnessFinding(report),
            writingFinding(report),
            mountsFinding(report, mounts),
            librariesFinding(report),
            pathsFinding("unreadable-folders", "unreadable folders",
                         absolutePaths(report, last.unreadableFolders), last.unreadableFolderCount,
                         "What is in them is not served; give yourself permission to read them.")};
}

}  // namespace marrowdale::host
