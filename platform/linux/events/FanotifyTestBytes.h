#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <fcntl.h>
#include <span>
#include <string>
#include <string_view>
#include <sys/fanotify.h>

namespace marrowdale::native {

// Writes what the kernel would write, for tests.
class FanotifyTestBytes {
  public:
    // A handle as records tell it: its type and its bytes.
    static std::string handle(std::int32_t type, std::string_view bytes) {
        return asText(type) + std::string(bytes);
    }

    // One piece of information: a handle and, behind it, a name that ends in a NUL.
    static std::string info(std::uint8_t kind, std::string_view handle, std::string_view name = {},
                            std::size_t padding = 0) {
        std::string body(sizeof(__kernel_fsid_t), '\x5a');
        body += asText(static_cast<std::uint32_t>(handle.size() - sizeof(std::int32_t)));
        body += handle;
        if (kind != FAN_EVENT_INFO_TYPE_FID && kind != FAN_EVENT_INFO_TYPE_DFID) {
            body += name;
            body += '\0';
        }
        body += std::string(padding, '\0');
        return unknownInfo(kind, body);
    }
    static std::string unknownInfo(std::uint8_t kind, std::string_view body) {
        fanotify_event_info_header header{};
        header.info_type = kind;
        header.len = static_cast<std::uint16_t>(sizeof header + body.size());
        return asText(header) + std::string(body);
    }

    FanotifyTestBytes& event(std::uint64_t mask, std::string_view infos) {
        fanotify_event_metadata event{};
        event.event_len = static_cast<std::uint32_t>(sizeof event + infos.size());
        event.vers = FANOTIFY_METADATA_VERSION;
        event.metadata_len = sizeof event;
        event.mask = mask;
        event.fd = FAN_NOFD;
        bytes_ += asText(event);
        bytes_ += infos;
        return *this;
    }

    [[nodiscard]] std::string& text() { return bytes_; }
    [[nodiscard]] std::span<const std::byte> bytes() const {
        return std::as_bytes(std::span(bytes_.data(), bytes_.size()));
    }

    template <typename Value>
    static std::string asText(const Value& value) {
        std::string text(sizeof value, '\0');
        std::memcpy(text.data(), &value, sizeof value);
        return text;
    }

  private:
    std::string bytes_;
};

}  // namespace marrowdale::native
