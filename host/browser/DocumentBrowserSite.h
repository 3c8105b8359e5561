#pragma once

#include <cstdint>
#include <string>

#include "host/browser/BrowserSite.h"
#include "host/browser/OrderedArchives.h"
#include "host/browser/RequestGuard.h"
#include "host/browser/Sessions.h"
#include "host/browser/SignedAddresses.h"
#include "host/browser/Uploads.h"
#include "host/daemon/HostService.h"

namespace marrowdale::host {

// What is served at the document browser's address: the page; the requests of docs/api.md, to those
// who have a session; what the page needs beyond them (docs/browser.md); and documents at signed
// addresses. Any thread.
class DocumentBrowserSite final : public BrowserSite {
  public:
    // The service outlives the site. `port` is where it is served.
    DocumentBrowserSite(HostService& service, std::uint16_t port);

    // An address that begins a session, once.
    [[nodiscard]] std::string newLaunchAddress();

    [[nodiscard]] std::optional<BrowserResponse> refusal(const HttpHead& head) override;
    [[nodiscard]] BrowserResponse fault(unsigned status, std::string_view reason) override;
    void handle(const BrowserRequest& request, const std::shared_ptr<BrowserReply>& reply) override;
    [[nodiscard]] std::variant<std::unique_ptr<ContentSink>, BrowserResponse> upload(
        const BrowserRequest& request) override;

  private:
    // None where the request comes with no session.
    [[nodiscard]] std::optional<std::uint64_t> sessionOf(const BrowserRequest& request);

    [[nodiscard]] BrowserResponse file(const BrowserRequest& request);
    [[nodiscard]] BrowserResponse beginSession(const BrowserRequest& request);
    // None where the request is one of the service's interface.
    [[nodiscard]] std::optional<BrowserResponse> ownAnswer(const BrowserRequest& request,
                                                           std::uint64_t session);
    [[nodiscard]] BrowserResponse sessions(std::uint64_t ownNumber);
    [[nodiscard]] BrowserResponse endSession(const std::string& number);
    [[nodiscard]] BrowserResponse newAddress(const BrowserRequest& request, std::uint64_t session);
    [[nodiscard]] BrowserResponse orderArchive(const BrowserRequest& request,
                                               std::uint64_t session);
    [[nodiscard]] BrowserResponse archive(std::string_view secret);
    [[nodiscard]] BrowserResponse collection(const ApiRequest& request);
    [[nodiscard]] BrowserResponse tags();
    [[nodiscard]] BrowserResponse putBackPlace(const std::string& item);
    [[nodiscard]] BrowserResponse space();
    [[nodiscard]] BrowserResponse content(const std::string& item, SignedPlace::View view,
                                          const HttpHead& head);

    HostService& service_;
    const std::string origin_;
    const RequestGuard guard_;
    Sessions sessions_;
    const SignedAddresses addresses_;
    OrderedArchives archives_;
    Uploads uploads_;
};

}  // namespace marrowdale::host
