#pragma once

#include <functional>
#include <string>
#include <string_view>

namespace marrowdale::host {

// Takes the bytes of an event stream as they come and tells of each event that is complete, in the
// format of server-sent events (WHATWG HTML, section 9.2): lines of "event: NAME" and "data: TEXT",
// an empty line at the end of each event, and comments that begin with a colon. One thread.
class EventStreamReader {
  public:
    using Taker = std::function<void(std::string_view name, std::string_view data)>;
    explicit EventStreamReader(Taker taker) : taker_(std::move(taker)) {}

    void take(std::string_view bytes);

  private:
    void takeLine(std::string_view line);

    Taker taker_;
    std::string pending_;  // the beginning of a line
    std::string name_;
    std::string data_;
    bool hasData_ = false;
};

}  // namespace marrowdale::host
