#include "host/cli/ActionReport.h"

#include <algorithm>
#include <string_view>
#include <unistd.h>

#include "host/daemon/ReadableSize.h"
#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

namespace {

constexpr std::chrono::milliseconds quiet{500};
constexpr std::chrono::milliseconds pause{100};
constexpr std::string_view eraseLine = "\r\x1b[K";
constexpr std::uint64_t barWidth = 30;
constexpr std::uint64_t whole = 100;

void tell(std::string_view text) {
    // Nobody is left to be told when this fails.
    [[maybe_unused]] const ssize_t written = ::write(STDERR_FILENO, text.data(), text.size());
}

std::string bar(std::uint64_t percent) {
    const auto done = static_cast<std::size_t>(percent * barWidth / whole);
    return "[" + std::string(done, '#') + std::string(barWidth - done, '.') + "] " +
           std::to_string(percent) + " %";
}

}  // namespace

ActionReport::ActionReport(Form form)
    : form_(form),
      draws_(form == Form::people && ::isatty(STDERR_FILENO) == 1),
      next_(Clock::now() + quiet) {}

std::string ActionReport::line(const ActionProgress& progress) {
    if (progress.totalBytes > 0) {
        const auto share =
            static_cast<double>(progress.bytes) / static_cast<double>(progress.totalBytes);
        const auto percent = static_cast<std::uint64_t>(share * static_cast<double>(whole));
        return bar(std::min(percent, whole)) + "  " + readableSize(progress.bytes) + " of " +
               readableSize(progress.totalBytes);
    }
    std::string text = std::to_string(progress.entries) + " done";
    return progress.bytes > 0 ? text + ", " + readableSize(progress.bytes) : text;
}

void ActionReport::progressed(const ActionProgress& progress) {
    if (!draws_) {
        return;
    }
    const MutexLock lock(mutex_);
    const auto now = Clock::now();
    if (now < next_) {
        return;
    }
    next_ = now + pause;
    isDrawn_ = true;
    tell(std::string(eraseLine) + line(progress));
}

void ActionReport::warned(const std::string& text) {
    const MutexLock lock(mutex_);
    erase();
    tell(form_ == Form::json ? textJson("warning", text) + "\n"
                             : "marrowdale: " + harmlessLine(text) + "\n");
}

void ActionReport::finish() {
    const MutexLock lock(mutex_);
    erase();
}

void ActionReport::erase() {
    if (isDrawn_) {
        isDrawn_ = false;
        tell(eraseLine);
    }
}

}  // namespace marrowdale::host
