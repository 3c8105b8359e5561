#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/daemon/Environment.h"
#include "host/daemon/Settings.h"
#include "host/requests/Finding.h"
#include "platform/linux/store/Retention.h"
#include "platform/linux/store/StoreReport.h"

namespace marrowdale::host {

// The findings below change nothing on the machine. Those of the root, the state and the machine
// are made in Doctor.cpp; the others in WatcherFindings.cpp, StoreFindings.cpp,
// HistoryFindings.cpp.

// What can be said of a storage root without opening its store.
[[nodiscard]] std::vector<Finding> rootFindings(const std::string& rootPath);

// What can be said of the folder of the state; the root's path may be empty when there is none.
[[nodiscard]] Finding stateFinding(const std::string& stateFolder, const std::string& rootPath);

// What can be said of the machine, whatever it serves.
[[nodiscard]] std::vector<Finding> machineFindings(const Environment& environment);

// What the store tells of itself, and of what the last look at the tree had to leave out. `mounts`:
// what is mounted below the root, by the kernel's table, which has mounts of the root's own file
// system too.
[[nodiscard]] std::vector<Finding> storeFindings(const native::StoreReport& report,
                                                 const std::vector<std::string>& mounts);

// What the store tells of the events it keeps and of the last look at the tree.
[[nodiscard]] std::vector<Finding> historyFindings(const native::StoreReport& report,
                                                   const native::Retention& retention);

// What would listen to that root: finds out by setting one mark and letting go of it.
[[nodiscard]] native::RecorderReport triedRecorder(const std::string& rootPath);

// What the recorder, or a tried one, tells of listening; `folders`: how many the tree has, where
// that is known.
[[nodiscard]] std::vector<Finding> listeningFindings(const native::RecorderReport& recorder,
                                                     std::optional<std::uint64_t> folders);
// What can be said of it where there is no root to try it on.
[[nodiscard]] std::vector<Finding> listeningFindings();

}  // namespace marrowdale::host
