#pragma once

#include <string_view>

namespace marrowdale::native {

// Whether an editor that saves "report.txt" may have put the earlier file aside under `candidate`:
// "report.txt~", "report.txt.~1~", "report.txt.bak", ".orig", ".old", "#report.txt#", or a hidden
// name that goes on from it (".report.txt.sb-1f2e"). Rotated names ("report.txt.1") are none: there
// the earlier file stays a document of its own.
[[nodiscard]] bool isBackupName(std::string_view original, std::string_view candidate);

}  // namespace marrowdale::native
