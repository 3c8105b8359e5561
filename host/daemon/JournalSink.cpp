#include "host/daemon/JournalSink.h"

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace marrowdale::host {

namespace {

using native::UniqueFD;

char priority(LogLevel level) {
    switch (level) {
        case LogLevel::debug:
            return '7';
        case LogLevel::info:
            return '6';
        case LogLevel::error:
            return '3';
    }
    return '3';
}

void appendLength(std::string& out, std::uint64_t length) {
    for (unsigned shift = 0; shift < 64; shift += 8) {
        out += static_cast<char>((length >> shift) & 0xFFU);
    }
}

// A memory file with the message, sealed, as the journal demands; empty when it can't be made.
UniqueFD sealedFile(std::string_view message) {
    UniqueFD file(::memfd_create("marrowdale-journal", MFD_ALLOW_SEALING | MFD_CLOEXEC));
    while (file && !message.empty()) {
        const ssize_t written = ::write(file.get(), message.data(), message.size());
        if (written <= 0) {
            return {};
        }
        message.remove_prefix(static_cast<std::size_t>(written));
    }
    const int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL;
    return file && ::fcntl(file.get(), F_ADD_SEALS, seals) == 0 ? std::move(file) : UniqueFD();
}

void sendDescriptor(int socket, int descriptor) {
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
    msghdr header{};
    header.msg_control = control.data();
    header.msg_controllen = control.size();
    cmsghdr* const part = CMSG_FIRSTHDR(&header);
    part->cmsg_level = SOL_SOCKET;
    part->cmsg_type = SCM_RIGHTS;
    part->cmsg_len = CMSG_LEN(sizeof(int));
    std::memcpy(CMSG_DATA(part), &descriptor, sizeof(int));
    // A journal that does not take it loses the line; there is nobody else to tell.
    (void)::sendmsg(socket, &header, MSG_NOSIGNAL);
}

}  // namespace

std::string journalMessage(LogLevel level, std::string_view line) {
    std::string message = "PRIORITY=";
    message += priority(level);
    message += "\nSYSLOG_IDENTIFIER=marrowdale\nMESSAGE\n";
    appendLength(message, line.size());
    message += line;
    message += '\n';
    return message;
}

std::shared_ptr<JournalSink> JournalSink::connect(const std::string& socketPath) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (socketPath.size() >= sizeof(address.sun_path)) {
        return nullptr;
    }
    socketPath.copy(std::begin(address.sun_path), socketPath.size());
    UniqueFD socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    // The system's interface takes every kind of address through a pointer to its common part.
    const auto* const plain = reinterpret_cast<const sockaddr*>(&address);
    if (!socket || ::connect(socket.get(), plain, sizeof(address)) != 0) {
        return nullptr;
    }
    return std::shared_ptr<JournalSink>(new JournalSink(std::move(socket)));
}

void JournalSink::write(LogLevel level, std::string_view line) {
    const std::string message = journalMessage(level, line);
    const ssize_t sent = ::send(socket_.get(), message.data(), message.size(), MSG_NOSIGNAL);
    if (sent >= 0 || (errno != EMSGSIZE && errno != ENOBUFS)) {
        return;
    }
    if (const UniqueFD file = sealedFile(message)) {
        sendDescriptor(socket_.get(), file.get());
    }
}

}  // namespace marrowdale::host
