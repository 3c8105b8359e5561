#pragma once

#include <memory>
#include <string>

#include "platform/foundation/Log.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

// Sends log lines to the system's journal over its own socket, as datagrams of fields: MESSAGE (any
// bytes, newlines included), PRIORITY (3, 6 or 7), SYSLOG_IDENTIFIER. What does not fit a datagram
// goes through a sealed memory file whose descriptor is sent. Any thread.
class JournalSink final : public LogSink {
  public:
    // Null when no journal listens there.
    [[nodiscard]] static std::shared_ptr<JournalSink> connect(
        const std::string& socketPath = "/run/systemd/journal/socket");

    void write(LogLevel level, std::string_view line) override;

  private:
    explicit JournalSink(native::UniqueFD socket) : socket_(std::move(socket)) {}
    native::UniqueFD socket_;
};

// The fields of one message as they go over the socket.
[[nodiscard]] std::string journalMessage(LogLevel level, std::string_view line);

}  // namespace marrowdale::host
