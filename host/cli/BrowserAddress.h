#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "host/cli/CommandContext.h"

namespace marrowdale::host {

// Prints which root is served and, where there is one, an address of the document browser, at once:
//   {"serving": PATH, "browser": ADDRESS}
void tellBrowserAddress(const CommandContext& context, std::string_view rootPath,
                        const std::optional<std::string>& address);

// Has the desktop's web browser go to an address of the document browser. Programs see each other's
// arguments, and the address is a secret, so what is handed over is a file that leads there, in the
// state folder, where others can't look. False where nobody sits at a display, or the file can't be
// written; that the web browser really comes can't be seen from here.
[[nodiscard]] bool showInWebBrowser(const Environment& environment, const std::string& stateFolder,
                                    const std::string& address);

}  // namespace marrowdale::host
