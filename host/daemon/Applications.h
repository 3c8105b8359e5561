#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/requests/Finding.h"
#include "platform/foundation/Log.h"
#include "platform/linux/applications/ApplicationWatch.h"
#include "platform/linux/applications/LinuxApplicationRegistry.h"
#include "platform/linux/icons/ApplicationIcons.h"

namespace marrowdale::host {

struct ApplicationsOptions {
    std::string storageRoot;  // without links
    std::string cacheFolder;  // where drawn icons are kept; empty for nowhere
    // The program that draws icons; where it is missing, applications have a plain one.
    std::string iconProgramPath;
    // The value of an environment variable; none when it is unset or empty. Any thread.
    std::function<std::optional<std::string>(std::string_view name)> variable;
    Log* log = nullptr;  // outlives it; may be null
    // See LinuxApplicationRegistryOptions.
    std::function<void(const std::vector<std::string>& paths)> documentFoldersChanged = nullptr;
};

// The applications of this system, with their icons, as a world has them. Icons cost nothing before
// somebody asks for one. Any thread.
class Applications {
  public:
    explicit Applications(const ApplicationsOptions& options);
    ~Applications();
    Applications(const Applications&) = delete;
    Applications& operator=(const Applications&) = delete;

    [[nodiscard]] native::LinuxApplicationRegistry& registry() { return registry_; }

    // Calls `changed` whenever applications may have changed, on a thread of its own, until
    // `stopWatching`. Where the system has no means for that, the log says so, and changes are
    // found when somebody asks for a refresh. Once.
    void watch(std::function<void()> changed);
    void stopWatching() { watch_.reset(); }

    // Icons are looked for anew.
    void forgetIcons();

    // What there is to say of packages, and of documents that can't be served.
    [[nodiscard]] std::vector<Finding> findings();

  private:
    [[nodiscard]] native::ApplicationIcons& icons();

    const ApplicationsOptions options_;
    std::once_flag iconsMade_;
    std::unique_ptr<native::ApplicationIcons> icons_;
    native::LinuxApplicationRegistry registry_;
    std::unique_ptr<native::ApplicationWatch> watch_;  // goes first
};

// "ok" or a note that says which applications' documents are left out, and why.
[[nodiscard]] Finding refusedLibrariesFinding(
    const std::vector<native::LinuxApplicationRegistry::Refused>& refused);

// Which folders are one document because applications say so.
[[nodiscard]] Finding packageExtensionsFinding(const std::vector<std::string>& extensions);

}  // namespace marrowdale::host
