#pragma once

#include <string>
#include <string_view>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {

// Identifiers of applications that tests install.
inline const std::string notes = "org.example.Notes";
inline const std::string sketch = "org.example.Sketch";

// A home in which a test installs applications.
class ApplicationHome : public Home {
  public:
    using Home::Home;

    // The file of an application's desktop entry, and the folder of its documents.
    [[nodiscard]] std::string entry(const std::string& identifier) const {
        return path(".local/share/applications/" + identifier + ".desktop");
    }
    [[nodiscard]] std::string library(const std::string& identifier) const {
        return path(".var/app/" + identifier + "/Documents");
    }
    void writeEntry(const std::string& identifier, std::string_view lines) const;
    // The two that it takes to be listed.
    void install(const std::string& identifier, std::string_view name) const;
};

}  // namespace marrowdale::tests
