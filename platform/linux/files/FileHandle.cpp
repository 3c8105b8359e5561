#include "platform/linux/files/FileHandle.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace marrowdale::native {

namespace {

constexpr std::size_t typeOffset = offsetof(::file_handle, handle_type);
constexpr std::size_t typeBytes = sizeof(::file_handle::handle_type);
static_assert(offsetof(::file_handle, f_handle) == typeOffset + typeBytes);

std::uint32_t wordAt(std::string_view bytes, std::size_t at) {
    std::uint32_t word = 0;
    std::memcpy(&word, bytes.data() + at, std::min(bytes.size() - at, sizeof word));
    return word;
}

}  // namespace

std::string_view FileHandle::bytes() const {
    std::uint32_t count = 0;
    std::memcpy(&count, room_.data(), sizeof count);
    return {room_.data() + typeOffset, typeBytes + std::min<std::size_t>(count, MAX_HANDLE_SZ)};
}

std::uint32_t FileHandle::fingerprint() const {
    return fingerprintOfHandle(bytes());
}

Expected<FileHandle> fileHandle(int directory, const char* name, int flags) {
    FileHandle found;
    auto* handle = reinterpret_cast<::file_handle*>(found.room_.data());
    handle->handle_bytes = MAX_HANDLE_SZ;
    int mount = 0;
    const int all = flags | (*name == '\0' ? AT_EMPTY_PATH : 0);
    if (::name_to_handle_at(directory, name, handle, &mount, all) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "get the handle of", name));
    }
    return found;
}

// Each word goes in through a multiplication by an odd number, so no single word can differ unseen.
std::uint32_t fingerprintOfHandle(std::string_view bytes) {
    std::uint32_t sum = wordAt(bytes, 0) * 0x9E3779B1U;
    std::uint32_t factor = 0x85EBCA6BU;
    for (std::size_t at = typeBytes; at < bytes.size(); at += typeBytes) {
        sum += wordAt(bytes, at) * factor;
        factor = factor * 0xC2B2AE35U + 2U;
    }
    sum ^= sum >> 16U;
    sum *= 0x7FEB352DU;
    sum ^= sum >> 15U;
    return sum == 0 ? 1U : sum;
}

}  // namespace marrowdale::native
