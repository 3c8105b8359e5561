#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/RefreshPacer.h"

namespace marrowdale {

// Turns requests into at most one reading of the registry each half second, and tells the host what
// to read again. Belongs to the provider; lives on while an event of its runs.
//
// A handler is called after every refresh from its request on; an empty one only asks. Any thread;
// handlers are called on the queue "marrowdale.app-refresh.queue".
class AppRefresh : public std::enable_shared_from_this<AppRefresh> {
  public:
    // Asks for a first refresh, soon.
    [[nodiscard]] static std::shared_ptr<AppRefresh> begin(const Platform& platform);

    void request(std::function<void()> completionHandler);

    // No refresh begins any more, and none is running when it returns, but for one that it is
    // called from.
    void end();

    // "marrowdale.app-refresh.queue"
    [[nodiscard]] const SerialQueue& queue() const { return appRefreshQueue_; }
    // Of the pacer; before the end.
    [[nodiscard]] const std::string& pacerName() const { return appRefreshPacer_->name(); }

  private:
    explicit AppRefresh(const Platform& platform);
    void paceEvent();
    void refreshAndSignal();
    void signal(std::string_view container) const;

    const Platform& platform_;
    const SerialQueue appRefreshQueue_;
    std::unique_ptr<RefreshPacer> appRefreshPacer_;
    std::vector<std::function<void()>> appRefreshCompletionHandlers_;  // on the queue
};

}  // namespace marrowdale
