#pragma once

#include "platform/foundation/Log.h"

namespace marrowdale::host {

// Writes each log line, made harmless, as one line to standard error, in one piece: lines of
// several threads never mix. What can't be written is lost; nobody could be told. Any thread.
class StandardErrorSink final : public LogSink {
  public:
    // `descriptor` stays the caller's.
    explicit StandardErrorSink(int descriptor = 2) : descriptor_(descriptor) {}
    void write(LogLevel level, std::string_view line) override;

  private:
    int descriptor_;
};

}  // namespace marrowdale::host
