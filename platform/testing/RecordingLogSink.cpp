#include "platform/testing/RecordingLogSink.h"

#include <algorithm>

namespace marrowdale {

void RecordingLogSink::write(LogLevel level, std::string_view line) {
    const std::lock_guard lock(mutex_);
    lines_.push_back({level, std::string(line)});
}

std::vector<std::string> RecordingLogSink::lines() const {
    const std::lock_guard lock(mutex_);
    std::vector<std::string> lines;
    for (const Line& line : lines_) {
        lines.push_back(line.text);
    }
    return lines;
}

std::size_t RecordingLogSink::count(std::string_view line) const {
    return static_cast<std::size_t>(std::ranges::count(lines(), line));
}

std::size_t RecordingLogSink::countContaining(std::string_view text) const {
    return static_cast<std::size_t>(std::ranges::count_if(
        lines(), [&](const std::string& line) { return line.find(text) != std::string::npos; }));
}

std::size_t RecordingLogSink::countOfLevel(LogLevel level) const {
    const std::lock_guard lock(mutex_);
    return static_cast<std::size_t>(std::ranges::count(lines_, level, &Line::level));
}

void RecordingLogSink::clear() {
    const std::lock_guard lock(mutex_);
    lines_.clear();
}

}  // namespace marrowdale
