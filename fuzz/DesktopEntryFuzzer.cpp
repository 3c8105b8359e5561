// Whatever the bytes of a desktop entry are, reading them ends. What is kept of them is text, and
// only what concerns us; and a language changes names alone.

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/Utf8.h"
#include "platform/linux/applications/DesktopEntry.h"

namespace {

using marrowdale::native::DesktopEntry;

void require(bool holds, const char* what) {
    if (!holds) {
        marrowdale::fatalError(what);
    }
}

bool isText(const std::optional<std::string>& text) {
    return !text || (!text->empty() && marrowdale::isUtf8(*text));
}

void check(const DesktopEntry& entry) {
    require(isText(entry.name) && isText(entry.icon), "a name that is no text");
    for (const auto& [key, value] : entry.info) {
        require(key.starts_with("Kv"), "a key that is none of ours");
        const auto* text = value.as<std::string>();
        require(text == nullptr || marrowdale::isUtf8(*text), "a value that is no text");
    }
    for (const std::string& extension : entry.packageExtensions()) {
        require(!extension.empty() && marrowdale::isUtf8(extension), "an extension that is none");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const std::string text(bytes, bytes + size);
    const auto plain = marrowdale::native::parseDesktopEntry(text, "");
    const auto german = marrowdale::native::parseDesktopEntry(text, "de_AT.UTF-8@euro");
    require(plain.has_value() == german.has_value(), "an entry in one language alone");
    if (plain) {
        check(*plain);
        check(*german);
        require(plain->info == german->info && plain->isHidden == german->isHidden &&
                    plain->isApplication == german->isApplication,
                "a language that changes more than names");
    }
    return 0;
}
