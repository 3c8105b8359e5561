#pragma once

#include <cstddef>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Log.h"

namespace marrowdale {

// Keeps every line, for tests of what is logged. Any thread.
class RecordingLogSink : public LogSink {
  public:
    void write(LogLevel level, std::string_view line) override;

    [[nodiscard]] std::vector<std::string> lines() const;
    // How many lines are exactly this one, the level in front included.
    [[nodiscard]] std::size_t count(std::string_view line) const;
    // How many lines hold this text.
    [[nodiscard]] std::size_t countContaining(std::string_view text) const;
    [[nodiscard]] std::size_t countOfLevel(LogLevel level) const;
    void clear();

  private:
    struct Line {
        LogLevel level;
        std::string text;
    };
    mutable std::mutex mutex_;
    std::vector<Line> lines_;  // guarded by mutex_
};

}  // namespace marrowdale
