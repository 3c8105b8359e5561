#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/applications/LinuxApplicationRegistry.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {

// A home with folders for desktop entries of the user and of the system, and for containers.
class ApplicationTestWorld : public ::testing::Test {
  protected:
    using Names = std::vector<std::string>;

    ApplicationTestWorld() {
        makeFolder(home("Documents"));
        makeFolder(home(".local/share/applications"));
        makeFolder(directory_.path("system/applications"));
    }
    std::string home(std::string_view name) const {
        return directory_.path("home/" + std::string(name));
    }
    std::string userEntry(const std::string& identifier) const {
        return home(".local/share/applications/" + identifier + ".desktop");
    }
    std::string systemEntry(const std::string& identifier) const {
        return directory_.path("system/applications/" + identifier + ".desktop");
    }
    static std::string entry(std::string_view name, std::string_view lines = {}) {
        return "[Desktop Entry]\nType=Application\nName=" + std::string(name) + "\n" +
               "X-KvSupportsDocumentBrowser=true\n" + std::string(lines);
    }
    void makeContainer(const std::string& identifier) const {
        makeFolder(container(identifier) + "/Documents");
    }
    std::string container(const std::string& identifier) const {
        return home(".var/app/" + identifier);
    }
    ApplicationPlaces places(std::string locale = {}) const {
        return applicationPlacesFor([&](std::string_view name) -> std::optional<std::string> {
            if (name == "HOME") {
                return directory_.path("home");
            }
            if (name == "XDG_DATA_DIRS") {
                return directory_.path("system");
            }
            return name == "LANG" && !locale.empty() ? std::optional(locale) : std::nullopt;
        });
    }
    LinuxApplicationRegistryOptions options(std::string locale = {}) {
        return {.places = places(std::move(locale)),
                .storageRoot = home("Documents"),
                .log = &log_,
                .icons = {},
                .documentFoldersChanged = {}};
    }
    static Names identifiers(LinuxApplicationRegistry& registry, ApplicationKind kind) {
        Names found;
        registry.enumerateApplications(kind, [&](const auto& record) {
            found.push_back(record->bundleIdentifier().value_or("none"));
        });
        return found;
    }

    TemporaryDirectory directory_;
    std::shared_ptr<RecordingLogSink> sink_ = std::make_shared<RecordingLogSink>();
    Log log_{sink_, LogLevel::debug};
};

}  // namespace marrowdale::native
