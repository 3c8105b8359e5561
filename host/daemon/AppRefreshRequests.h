#pragma once

#include <memory>

#include "platform/hostframework/FileProviderApplications.h"

namespace marrowdale::host {

// A host's requests to read the registry of applications again. An extension calls a handler after
// every refresh for as long as it lives, so there is one handler for all requests. Any thread;
// outlives no extension.
class AppRefreshRequests {
  public:
    // Asks for a first refresh.
    explicit AppRefreshRequests(FileProviderApplications& extension);

    // Returns once that first refresh, or any later one, was done.
    void waitForFirst();
    // Asks for a refresh, and leaves it to come.
    void ask();
    // Asks for a refresh and returns once one that began after the call was done.
    void refreshNow();

  private:
    class Count;
    FileProviderApplications& extension_;
    // Shared with the handler, which the extension keeps.
    const std::shared_ptr<Count> count_;
};

}  // namespace marrowdale::host
