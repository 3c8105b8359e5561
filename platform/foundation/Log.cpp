#include "platform/foundation/Log.h"

#include <limits>
#include <utility>

#include "platform/foundation/FatalError.h"

namespace marrowdale {

namespace {

constexpr std::string_view prefix(LogLevel level) {
    switch (level) {
        case LogLevel::debug:
            return "[DEBUG] ";
        case LogLevel::info:
            return "[INFO] ";
        case LogLevel::error:
            break;
    }
    return "[ERROR] ";
}

}  // namespace

Log::Log(std::shared_ptr<LogSink> sink, LogLevel threshold, std::uint64_t firstSectionNumber)
    : sink_(std::move(sink)),
      threshold_(threshold),
      sectionQueue_("marrowdale.log-section"),
      nextSectionNumber_(firstSectionNumber) {}

Log::~Log() = default;

void Log::write(LogLevel level, std::string_view text) const {
    if (!isEnabled(level)) {
        return;
    }
    std::string line(prefix(level));
    line += text;
    sink_->write(level, line);
}

std::uint64_t Log::takeSectionNumber() {
    std::uint64_t number = 0;
    sectionQueue_.sync([&] {
        if (nextSectionNumber_ == std::numeric_limits<std::uint64_t>::max()) {
            fatalError("log sections ran out of numbers");
        }
        number = nextSectionNumber_++;
    });
    return number;
}

LogSection::LogSection(Log& log, std::string_view title)
    : log_(log), number_(log.takeSectionNumber()) {
    log_.debug([&] { return openingText(title); });
}

LogSection::~LogSection() {
    log_.debug([this] { return "┗" + std::to_string(number_); });
}

std::string LogSection::openingText(std::string_view title) const {
    std::string text = "┏" + std::to_string(number_) + ' ';
    text += title;
    return text;
}

}  // namespace marrowdale
