// Whether folders that somebody saw are in the index.

#include <algorithm>
#include <numeric>
#include <utility>

#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

namespace {

// One pass sees all that was done before it. A folder that stands after it and is not known came
// back in between, which may happen again.
constexpr int mostPasses = 3;

}  // namespace

Expected<void> Store::Core::confirmFolders(std::span<Request> requests) {
    for (Request& request : requests) {
        request.isThere = true;
    }
    std::vector<std::size_t> unknown(requests.size());
    std::iota(unknown.begin(), unknown.end(), std::size_t{0});
    dropKnown(requests, unknown);
    dropUnindexed(requests, unknown);
    for (int pass = 0; pass < mostPasses && !unknown.empty(); ++pass) {
        if (auto done = lookForMissing(); !done) {
            return done;
        }
        dropKnown(requests, unknown);
        std::erase_if(unknown, [&](std::size_t i) {
            requests[i].isThere = stands(requests[i]);
            return !requests[i].isThere;
        });
    }
    return {};
}

void Store::Core::dropKnown(std::span<const Request> requests, std::vector<std::size_t>& unknown) {
    std::vector<std::size_t> left;
    const MutexLock lock(mutex_);
    waitUntilIdle();
    for (const std::size_t i : unknown) {
        if (!isKnownFolder(requests[i])) {
            left.push_back(i);
        }
    }
    unknown = std::move(left);
}

bool Store::Core::isKnownFolder(const Request& request) {
    if (rootRowOf(request) != noRow) {
        return true;
    }
    const RowNumber parent = folderRow(request.folder);
    if (parent == noRow) {
        return false;
    }
    // What a folder holds that can't be listed is known to those alone who know its name.
    if (index_.row(parent).has(Row::unreadable)) {
        return true;
    }
    const RowNumber row = index_.child(parent, request.name);
    return row != noRow && EntryMerger::isSameFile(index_.row(row), {request.status, 0, {}}, true);
}

void Store::Core::dropUnindexed(std::span<const Request> requests,
                                std::vector<std::size_t>& unknown) const {
    if (unknown.empty()) {
        return;
    }
    const auto unindexed = unindexedFolders();
    std::erase_if(unknown, [&](std::size_t i) {
        const Request& request = requests[i];
        return request.status.device != device_ || request.status.isMountPoint ||
               !roots_.storedPath(request.folderPath) || isUnindexed(request, unindexed);
    });
}

bool Store::Core::stands(const Request& request) const {
    const auto folder = folderOf(request);
    if (!folder || !*folder) {
        return false;
    }
    const auto status = statEntry(folder->get(), std::string(request.name).c_str());
    return status && status->fileID == request.status.fileID &&
           status->birth == request.status.birth;
}

}  // namespace marrowdale::native
