#pragma once

#include <functional>
#include <memory>
#include <string>

#include "host/daemon/ApiMessages.h"
#include "host/daemon/LocalRequests.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// The requests of docs/api.md: takes one apart, has the provider answer it, and puts the answer
// together. Any thread, several at once.
class Api {
  public:
    // The requests outlive the API and every reply that it was given.
    explicit Api(LocalRequests& requests) : requests_(requests) {}

    // Where the document browser is, for as long as there is one: answers an address that is good
    // for one web browser. Null takes it back and waits for those who are just asking.
    using NewBrowserAddress = std::function<std::string()>;
    void offerBrowser(NewBrowserAddress newAddress);

    // Waits for the provider, but not for the client; streams of events go on after the return.
    void handle(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply);

  private:
    [[nodiscard]] ApiAnswer answerTo(const ApiRequest& request);
    [[nodiscard]] ApiAnswer itemAnswer(const ApiRequest& request);
    [[nodiscard]] ApiAnswer childrenOf(const ApiRequest& request);
    [[nodiscard]] ApiAnswer changesOf(const ApiRequest& request);
    [[nodiscard]] ApiAnswer lookUp(const ApiRequest& request);
    [[nodiscard]] ApiAnswer thumbnailOf(const std::string& identifier);
    [[nodiscard]] ApiAnswer applicationsAnswer(const ApiRequest& request);
    [[nodiscard]] ApiAnswer refresh(const ApiRequest& request);
    [[nodiscard]] ApiAnswer launch(const ApiRequest& request);
    void act(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply);
    void signals(const ApiRequest& request, const std::shared_ptr<ApiReply>& reply);

    LocalRequests& requests_;
    Mutex mutex_;
    NewBrowserAddress newBrowserAddress_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::host
