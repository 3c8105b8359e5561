#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/PropertyList.h"

namespace marrowdale::native {

// What a desktop entry says, as far as it concerns us.
struct DesktopEntry {
    bool isApplication = false;  // "Type"
    bool isHidden = false;       // as good as deleted, and hides what it would hide
    std::optional<std::string> name;
    std::optional<std::string> icon;  // a name in the icon theme, or an absolute path
    // Its keys that begin with "X-Kv", without the "X-": a boolean where the value is one, an array
    // of strings for KvPackageExtensions, else a string. Values that are no text are left out.
    PropertyListDictionary info;

    [[nodiscard]] bool says(std::string_view key) const;
    [[nodiscard]] std::vector<std::string> packageExtensions() const;
};

// Reads an entry; none for bytes that are none. Text comes in the language of `locale` where the
// entry has it, also in the locale's language without its country, else as the entry is written.
[[nodiscard]] std::optional<DesktopEntry> parseDesktopEntry(std::string_view bytes,
                                                            const std::string& locale);

}  // namespace marrowdale::native
