#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "host/browser/BrowserSite.h"
#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Takes documents that come over a connection. The content goes to a file in a folder of the
// state, never to memory; when all of it is there, the provider imports it, which takes no name
// that is taken. Whatever happens before, nothing is seen of it in the documents. Any thread.
class Uploads {
  public:
    // `folder` is ours alone: what a killed process left in it is removed here. The requests
    // outlive the object and every sink.
    Uploads(ItemRequests& items, ActionRequests& actions, std::string folder);

    // A document of that name, to come into that folder. Refused where the folder takes none
    // (writeNoPermission), where the name is taken (filenameCollision), or is none.
    [[nodiscard]] Expected<std::unique_ptr<ContentSink>> begin(std::string_view parent,
                                                               std::string_view name);

  private:
    class Sink;
    ItemRequests& items_;
    ActionRequests& actions_;
    const std::string folder_;
};

}  // namespace marrowdale::host
