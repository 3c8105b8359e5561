#include "host/client/EventStreamReader.h"

namespace marrowdale::host {

void EventStreamReader::take(std::string_view bytes) {
    while (!bytes.empty()) {
        const std::size_t end = bytes.find('\n');
        pending_ += bytes.substr(0, end);
        if (end == std::string_view::npos) {
            return;
        }
        bytes.remove_prefix(end + 1);
        std::string line;
        line.swap(pending_);
        if (line.ends_with('\r')) {
            line.pop_back();
        }
        takeLine(line);
    }
}

void EventStreamReader::takeLine(std::string_view line) {
    if (line.empty()) {
        if (hasData_) {
            taker_(name_.empty() ? "message" : name_, data_);
        }
        name_.clear();
        data_.clear();
        hasData_ = false;
        return;
    }
    const std::size_t colon = line.find(':');
    const std::string_view field = line.substr(0, colon);
    std::string_view value = colon == std::string_view::npos ? "" : line.substr(colon + 1);
    if (value.starts_with(' ')) {
        value.remove_prefix(1);
    }
    if (field == "event") {
        name_ = value;
    } else if (field == "data") {
        data_ += hasData_ ? "\n" : "";
        data_ += value;
        hasData_ = true;
    }
}

}  // namespace marrowdale::host
