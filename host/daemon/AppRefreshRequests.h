#pragma once

#include <functional>
#include <memory>

#include "platform/hostframework/FileProviderApplications.h"

namespace marrowdale::host {

// A host's requests to read the registry of applications again. An extension calls a handler after
// every refresh for as long as it lives, so there is one handler for all requests. Any thread;
// outlives no extension.
class AppRefreshRequests {
  public:
    // Asks for a first refresh. `refreshed` (may be null) is called after every refresh, before
    // those who wait for it go on, on the extension's own queue; never after this object is gone.
    explicit AppRefreshRequests(FileProviderApplications& extension,
                                std::function<void()> refreshed = nullptr);
    ~AppRefreshRequests() { stopTelling(); }
    AppRefreshRequests(const AppRefreshRequests&) = delete;
    AppRefreshRequests& operator=(const AppRefreshRequests&) = delete;

    // Returns once that first refresh, or any later one, was done.
    void waitForFirst();
    // Asks for a refresh, and leaves it to come.
    void ask();
    // Asks for a refresh and returns once one that began after the call was done.
    void refreshNow();
    // `refreshed` is called no more; waits for a call of it that is running.
    void stopTelling();

  private:
    class Count;
    FileProviderApplications& extension_;
    // Shared with the handler, which the extension keeps.
    const std::shared_ptr<Count> count_;
};

}  // namespace marrowdale::host
