#include "host/browser/ContentTypes.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include "host/requests/HarmlessText.h"
#include "platform/foundation/PercentEncoding.h"

namespace marrowdale::host {

namespace {

constexpr std::array<std::string_view, 8> pictures{"image/png",
                                                   "image/jpeg",
                                                   "image/gif",
                                                   "image/webp",
                                                   "image/avif",
                                                   "image/bmp",
                                                   "image/vnd.microsoft.icon",
                                                   "image/x-icon"};

// The name as text in one line.
std::string plainName(std::string_view name) {
    std::string plain;
    while (!name.empty()) {
        const std::size_t length = leadingCharacter(name).length;
        const std::string_view character = name.substr(0, std::max<std::size_t>(length, 1));
        if (length == 0) {
            plain += "\xEF\xBF\xBD";
        } else if (isHarmless(character)) {
            plain += character;
        }
        name.remove_prefix(character.size());
    }
    return plain;
}

// For those who don't read the other form.
std::string asciiName(std::string_view name) {
    std::string ascii(name);
    std::ranges::replace_if(
        ascii,
        [](char character) {
            return character < ' ' || character > '~' || character == '"' || character == '\\' ||
                   character == '%';
        },
        '_');
    return ascii;
}

std::string namedAs(std::string_view disposition, std::string_view name) {
    std::string plain = plainName(name);
    std::ranges::replace(plain, '/', '_');
    return std::string(disposition) + "; filename=\"" + asciiName(plain) + "\"; filename*=UTF-8''" +
           percentEncodedPath(plain);
}

}  // namespace

std::optional<std::string> shownContentType(std::string_view typeIdentifier) {
    const bool isShown = std::ranges::find(pictures, typeIdentifier) != pictures.end() ||
                         typeIdentifier == "application/pdf" ||
                         typeIdentifier.starts_with("audio/") ||
                         typeIdentifier.starts_with("video/");
    return isShown ? std::optional<std::string>(typeIdentifier) : std::nullopt;
}

std::string attachmentNamed(std::string_view name) {
    return namedAs("attachment", name);
}

std::string shownNamed(std::string_view name) {
    return namedAs("inline", name);
}

}  // namespace marrowdale::host
