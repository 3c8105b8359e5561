#include "tests/system/ApplicationHome.h"

namespace marrowdale::tests {

void ApplicationHome::writeEntry(const std::string& identifier, std::string_view lines) const {
    makeFolder(path(".local/share/applications"));
    writeFile(entry(identifier), "[Desktop Entry]\nType=Application\n" + std::string(lines));
}

void ApplicationHome::install(const std::string& identifier, std::string_view name) const {
    makeFolder(library(identifier));
    writeEntry(identifier, "Name=" + std::string(name) + "\nX-KvSupportsDocumentBrowser=true\n");
}

}  // namespace marrowdale::tests
