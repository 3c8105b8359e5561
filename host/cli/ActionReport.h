#pragma once

#include <chrono>
#include <cstdint>
#include <string>

#include "host/requests/ItemAction.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Tells people on standard error how an action gets on: a line that is drawn again and again on a
// terminal, for what takes longer than half a second; and whatever could not be kept. Any thread.
class ActionReport final : public ActionObserver {
  public:
    enum class Form : std::uint8_t { people, json };
    using Clock = std::chrono::steady_clock;

    explicit ActionReport(Form form);

    void progressed(const ActionProgress& progress) override;
    void warned(const std::string& text) override;
    // Takes the line away.
    void finish();

    // The line for that progress, without the codes that draw it.
    [[nodiscard]] static std::string line(const ActionProgress& progress);

  private:
    void erase() MARROWDALE_REQUIRES(mutex_);

    Form form_;
    bool draws_;
    Mutex mutex_;
    Clock::time_point next_ MARROWDALE_GUARDED_BY(mutex_);
    bool isDrawn_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

}  // namespace marrowdale::host
