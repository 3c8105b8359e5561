#include "platform/linux/operations/ItemNames.h"

#include <algorithm>
#include <cerrno>

namespace marrowdale::native {

namespace {

// Longer ones are no extensions, and would leave no room for the name.
constexpr std::size_t longestExtension = 64;
// A blank and the digits of the largest number.
constexpr std::size_t longestNumber = 21;

std::size_t extensionLength(std::string_view name, NumberPlace place) {
    const auto dot = name.rfind('.');
    if (place == NumberPlace::atEnd || dot == std::string_view::npos || dot == 0) {
        return 0;
    }
    const auto extension = name.substr(dot);
    const bool isOne = extension.size() > 1 && extension.size() <= longestExtension &&
                       extension.find(' ') == std::string_view::npos;
    return isOne ? extension.size() : 0;
}

bool continuesCharacter(char byte) {
    return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

// At most `room` bytes of it, whole characters where it is made of such.
std::string_view cut(std::string_view text, std::size_t room) {
    if (text.size() <= room) {
        return text;
    }
    constexpr std::size_t longestCharacter = 4;
    std::size_t end = room;
    while (end > 0 && room - end < longestCharacter && continuesCharacter(text[end])) {
        --end;
    }
    const bool foundStart = !continuesCharacter(text[end]);
    return text.substr(0, foundStart ? end : room);
}

}  // namespace

Expected<void> checkName(std::string_view name, std::string_view operation) {
    constexpr std::string_view notAllowed("/\0", 2);
    if (name.empty() || name == "." || name == ".." ||
        name.find_first_of(notAllowed) != std::string_view::npos) {
        return Unexpected(errorWithPOSIXCode(EINVAL, operation, name));
    }
    if (name.size() > longestName) {
        return Unexpected(errorWithPOSIXCode(ENAMETOOLONG, operation, name));
    }
    return {};
}

std::string numberedName(std::string_view name, std::uint64_t number, NumberPlace place) {
    const std::size_t length = extensionLength(name, place);
    const auto extension = name.substr(name.size() - length);
    const std::string suffix = " " + std::to_string(number) + std::string(extension);
    const auto stem = name.substr(0, name.size() - length);
    return std::string(cut(stem, longestName - suffix.size())) + suffix;
}

std::string_view commonStart(std::string_view name, NumberPlace place) {
    const std::size_t length = extensionLength(name, place);
    constexpr std::size_t slack = 4;  // a character that is cut off whole
    const std::size_t room = longestName - longestNumber - length - slack;
    return name.substr(0, std::min(name.size() - length, room));
}

}  // namespace marrowdale::native
