#pragma once

#include <concepts>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "platform/foundation/SerialQueue.h"

namespace marrowdale {

enum class LogLevel : std::uint8_t { debug, info, error };

// Where lines go. `line` comes whole, with its "[DEBUG] " (and so on) in front, without a newline
// at its end; it may hold any bytes, newlines included, which a sink must make harmless for its
// medium. Called from any thread, several at once.
class LogSink {
  public:
    virtual ~LogSink() = default;
    virtual void write(LogLevel level, std::string_view line) = 0;
};

// The log of one world (one set of platform objects), category "marrowdale". Immutable after
// construction but for the section counter.
//
// A level below the threshold costs one comparison: hand the text over as a function.
class Log {
  public:
    // `sink` may be null: then nothing is ever enabled. `firstSectionNumber` is for tests of the
    // counter's end.
    Log(std::shared_ptr<LogSink> sink, LogLevel threshold, std::uint64_t firstSectionNumber = 0);
    ~Log();
    Log(const Log&) = delete;
    Log& operator=(const Log&) = delete;

    [[nodiscard]] bool isEnabled(LogLevel level) const { return sink_ && level >= threshold_; }

    // Writes "[DEBUG] ", "[INFO] " or "[ERROR] " and the text.
    void write(LogLevel level, std::string_view text) const;
    template <typename MakeText>
    void debug(MakeText&& makeText) const {
        if (isEnabled(LogLevel::debug)) {
            write(LogLevel::debug, makeText());
        }
    }
    template <typename MakeText>
    void info(MakeText&& makeText) const {
        if (isEnabled(LogLevel::info)) {
            write(LogLevel::info, makeText());
        }
    }
    void error(std::string_view text) const { write(LogLevel::error, text); }

    // Takes the next section number, from 0, on the queue "marrowdale.log-section", so two threads
    // never get the same one; ends the process when the counter would pass the largest number.
    std::uint64_t takeSectionNumber();

  private:
    std::shared_ptr<LogSink> sink_;
    LogLevel threshold_;
    SerialQueue sectionQueue_;             // "marrowdale.log-section"
    std::uint64_t nextSectionNumber_ = 0;  // touched on sectionQueue_ alone
};

// A traced operation: "[DEBUG] ┏NUMBER TITLE" when made, "[DEBUG] ┗NUMBER" when it ends. A number
// is taken whether or not the debug level is enabled.
class LogSection {
  public:
    LogSection(Log& log, std::string_view title);
    // The title as a function, which is called only when the debug level is enabled.
    template <std::invocable MakeTitle>
    LogSection(Log& log, MakeTitle&& makeTitle) : log_(log), number_(log.takeSectionNumber()) {
        log_.debug([&] { return openingText(makeTitle()); });
    }
    ~LogSection();
    LogSection(const LogSection&) = delete;
    LogSection& operator=(const LogSection&) = delete;

    [[nodiscard]] std::uint64_t number() const { return number_; }

  private:
    [[nodiscard]] std::string openingText(std::string_view title) const;

    Log& log_;
    std::uint64_t number_;
};

}  // namespace marrowdale
