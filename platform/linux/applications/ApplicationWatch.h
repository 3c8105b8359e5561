#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <thread>

#include "platform/foundation/Error.h"
#include "platform/linux/applications/ApplicationPlaces.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// Notices that applications may have changed: a desktop entry or a folder of them comes, goes or is
// written, an application's data folder or its "Documents" comes or goes. Folders that do not exist
// yet are waited for at the nearest folder above them that does. It tells that something changed,
// not what; a change is told soon after it happened, several close together once. A folder for
// which the system has no watch left is not noticed.
class ApplicationWatch {
  public:
    // `changed` is called on the watch's own thread, from now on until the watch is gone. Fails
    // with the system's error where there is no instance left.
    [[nodiscard]] static Expected<std::unique_ptr<ApplicationWatch>> start(
        ApplicationPlaces places, std::function<void()> changed);
    // Waits for a call of `changed` that is running.
    ~ApplicationWatch();
    ApplicationWatch(const ApplicationWatch&) = delete;
    ApplicationWatch& operator=(const ApplicationWatch&) = delete;

  private:
    // What a watched folder is watched for.
    struct Interest {
        std::string path;
        bool everything = false;      // whatever happens in it
        std::set<std::string> names;  // else these names in it
    };
    ApplicationWatch(ApplicationPlaces places, std::function<void()> changed, UniqueFD inotify,
                     UniqueFD end);
    void serve();
    [[nodiscard]] bool waitForEvents() const;
    [[nodiscard]] bool readEvents();
    [[nodiscard]] bool concernsUs(int watch, std::uint32_t mask, std::string_view name) const;
    void watchEverything();
    void want(std::map<std::string, Interest>& wanted, const std::string& folder,
              const std::string& name);
    void wantTree(std::map<std::string, Interest>& wanted, const std::string& folder,
                  unsigned depth);
    void wantContainers(std::map<std::string, Interest>& wanted);
    void apply(std::map<std::string, Interest> wanted);

    const ApplicationPlaces places_;
    const std::function<void()> changed_;
    const UniqueFD inotify_;
    const UniqueFD end_;  // becomes readable when the thread is to end
    // On the thread, and before it starts.
    std::map<int, Interest> watches_;
    std::thread thread_;
};

}  // namespace marrowdale::native
