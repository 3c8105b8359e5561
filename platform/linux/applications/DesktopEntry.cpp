#include "platform/linux/applications/DesktopEntry.h"

#include <glib.h>
#include <memory>
#include <span>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr const char* group = "Desktop Entry";
constexpr std::string_view extensionPrefix = "X-";
constexpr std::string_view ownPrefix = "X-Kv";
constexpr std::string_view packageExtensionsKey = "KvPackageExtensions";

struct Free {
    void operator()(gchar* text) const { ::g_free(text); }
    void operator()(gchar** texts) const { ::g_strfreev(texts); }
    void operator()(GKeyFile* file) const { ::g_key_file_free(file); }
};
using KeyFile = std::unique_ptr<GKeyFile, Free>;
using Text = std::unique_ptr<gchar, Free>;
using Texts = std::unique_ptr<gchar*, Free>;

std::optional<std::string> valueIn(const Text& text) {
    return text ? std::optional<std::string>(text.get()) : std::nullopt;
}

std::optional<std::string> stringValue(GKeyFile* file, const char* key) {
    return valueIn(Text(::g_key_file_get_string(file, group, key, nullptr)));
}

// The library also takes the names of charsets and modifiers apart.
std::optional<std::string> localizedValue(GKeyFile* file, const char* key,
                                          const std::string& locale) {
    if (!locale.empty()) {
        if (auto text = valueIn(
                Text(::g_key_file_get_locale_string(file, group, key, locale.c_str(), nullptr)))) {
            return text;
        }
    }
    return stringValue(file, key);
}

bool booleanValue(GKeyFile* file, const char* key) {
    return ::g_key_file_get_boolean(file, group, key, nullptr) != FALSE;
}

PropertyListArray listValue(GKeyFile* file, const char* key) {
    gsize count = 0;
    const Texts texts(::g_key_file_get_string_list(file, group, key, &count, nullptr));
    PropertyListArray list;
    if (texts) {
        for (const gchar* text : std::span(texts.get(), count)) {
            list.emplace_back(std::string(text));
        }
    }
    return list;
}

std::optional<PropertyList> infoValue(GKeyFile* file, const char* key) {
    if (std::string_view(key).substr(extensionPrefix.size()) == packageExtensionsKey) {
        return PropertyList(listValue(file, key));
    }
    const auto text = stringValue(file, key);
    if (!text) {
        return std::nullopt;
    }
    if (*text == "true" || *text == "false") {
        return PropertyList(*text == "true");
    }
    return PropertyList(*text);
}

PropertyListDictionary infoIn(GKeyFile* file) {
    PropertyListDictionary info;
    gsize count = 0;
    const Texts keys(::g_key_file_get_keys(file, group, &count, nullptr));
    if (!keys) {
        return info;
    }
    for (const gchar* key : std::span(keys.get(), count)) {
        const std::string_view name(key);
        if (!name.starts_with(ownPrefix) || name.ends_with(']')) {
            continue;
        }
        if (auto value = infoValue(file, key)) {
            info.insert_or_assign(std::string(name.substr(extensionPrefix.size())),
                                  *std::move(value));
        }
    }
    return info;
}

std::optional<std::string> unlessEmpty(std::optional<std::string> text) {
    return text && !text->empty() ? std::move(text) : std::nullopt;
}

}  // namespace

bool DesktopEntry::says(std::string_view key) const {
    const auto value = info.find(key);
    const bool* flag = value == info.end() ? nullptr : value->second.as<bool>();
    return flag && *flag;
}

std::vector<std::string> DesktopEntry::packageExtensions() const {
    const auto value = info.find(packageExtensionsKey);
    const auto* list = value == info.end() ? nullptr : value->second.as<PropertyListArray>();
    std::vector<std::string> extensions;
    for (const PropertyList& element : list ? *list : PropertyListArray()) {
        const auto* text = element.as<std::string>();
        if (text && !text->empty()) {
            extensions.push_back(*text);
        }
    }
    return extensions;
}

std::optional<DesktopEntry> parseDesktopEntry(std::string_view bytes, const std::string& locale) {
    // The library takes texts, which end at a zero byte; no entry has one.
    if (bytes.empty() || bytes.contains('\0')) {
        return std::nullopt;
    }
    const KeyFile file(::g_key_file_new());
    const auto flags =
        static_cast<GKeyFileFlags>(G_KEY_FILE_KEEP_TRANSLATIONS);  // NOLINT(*-enum-*)
    if (::g_key_file_load_from_data(file.get(), bytes.data(), bytes.size(), flags, nullptr) ==
            FALSE ||
        ::g_key_file_has_group(file.get(), group) == FALSE) {
        return std::nullopt;
    }
    return DesktopEntry{.isApplication = stringValue(file.get(), "Type") == "Application",
                        .isHidden = booleanValue(file.get(), "Hidden"),
                        .name = unlessEmpty(localizedValue(file.get(), "Name", locale)),
                        .icon = unlessEmpty(localizedValue(file.get(), "Icon", locale)),
                        .info = infoIn(file.get())};
}

}  // namespace marrowdale::native
