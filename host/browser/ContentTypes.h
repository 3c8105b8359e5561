#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace marrowdale::host {

// As what a web browser may show a document of a type by itself: pictures, sound, film and pages
// for print in formats without active content. None for everything else, HTML and SVG above all:
// those are only downloaded.
[[nodiscard]] std::optional<std::string> shownContentType(std::string_view typeIdentifier);

// A Content-Disposition field that has a document downloaded under its name. Control characters
// and marks that turn the direction of text are left out of the name; bytes that are no UTF-8
// become U+FFFD.
[[nodiscard]] std::string attachmentNamed(std::string_view name);
// The same for one that is shown, and maybe kept from there.
[[nodiscard]] std::string shownNamed(std::string_view name);

}  // namespace marrowdale::host
