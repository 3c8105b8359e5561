#include "platform/linux/icons/IconTheme.h"

#include <algorithm>
#include <array>
#include <fcntl.h>
#include <glib.h>
#include <limits>
#include <memory>
#include <span>
#include <unistd.h>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::string_view fallbackTheme = "hicolor";
constexpr std::array<std::string_view, 2> extensions = {".png", ".svg"};
constexpr unsigned deepestInheritance = 16;
constexpr std::size_t mostDirectories = 4096;

using Variable = std::function<std::optional<std::string>(std::string_view)>;

struct Free {
    void operator()(gchar* text) const { ::g_free(text); }
    void operator()(gchar** texts) const { ::g_strfreev(texts); }
    void operator()(GKeyFile* file) const { ::g_key_file_free(file); }
};
using KeyFile = std::unique_ptr<GKeyFile, Free>;

KeyFile readKeyFile(const std::string& path) {
    KeyFile file(::g_key_file_new());
    if (::g_key_file_load_from_file(file.get(), path.c_str(), G_KEY_FILE_NONE, nullptr) == FALSE) {
        return nullptr;
    }
    return file;
}

std::optional<std::string> text(GKeyFile* file, const char* group, const char* key) {
    const std::unique_ptr<gchar, Free> value(::g_key_file_get_string(file, group, key, nullptr));
    return value ? std::optional<std::string>(value.get()) : std::nullopt;
}

// Lists in these files are separated by commas.
std::vector<std::string> list(GKeyFile* file, const char* group, const char* key) {
    std::vector<std::string> values;
    const std::string joined = text(file, group, key).value_or("");
    for (std::size_t begin = 0; begin < joined.size() && values.size() < mostDirectories;) {
        const std::size_t end = std::min(joined.find(',', begin), joined.size());
        std::string value = joined.substr(begin, end - begin);
        const auto first = value.find_first_not_of(" \t");
        if (first != std::string::npos) {
            values.push_back(value.substr(first, value.find_last_not_of(" \t") - first + 1));
        }
        begin = end + 1;
    }
    return values;
}

unsigned number(GKeyFile* file, const std::string& group, const char* key, unsigned otherwise) {
    const gint value = ::g_key_file_get_integer(file, group.c_str(), key, nullptr);
    constexpr gint largest = 4096;
    return value > 0 && value <= largest ? static_cast<unsigned>(value) : otherwise;
}

// A name of one folder; the name of a theme comes from files and settings.
bool isPlainName(std::string_view name) {
    return !name.empty() && name != "." && name != ".." && !name.contains('/');
}

bool isReadable(const std::string& path) {
    return ::faccessat(AT_FDCWD, path.c_str(), R_OK, AT_EACCESS) == 0;
}

void addIconsFolder(std::vector<std::string>& folders, const std::string& data) {
    const std::string folder = data + "/icons";
    if (data.starts_with('/') && std::ranges::find(folders, folder) == folders.end()) {
        folders.push_back(folder);
    }
}

std::string themeOf(const Variable& variable) {
    if (const auto theme = variable("MARROWDALE_ICON_THEME")) {
        return *theme;
    }
    auto config = variable("XDG_CONFIG_HOME");
    if (!config || !config->starts_with('/')) {
        const auto home = variable("HOME");
        config = home ? std::optional(*home + "/.config") : std::nullopt;
    }
    const auto settings = config ? readKeyFile(*config + "/gtk-3.0/settings.ini") : nullptr;
    const auto named =
        settings ? text(settings.get(), "Settings", "gtk-icon-theme-name") : std::nullopt;
    return named && isPlainName(*named) ? *named : "Adwaita";
}

unsigned gap(unsigned low, unsigned high, unsigned value) {
    if (value < low) {
        return low - value;
    }
    return value > high ? value - high : 0;
}

}  // namespace

IconTheme::Places IconTheme::placesFor(const Variable& variable) {
    Places places;
    const auto home = variable("HOME");
    if (home && home->starts_with('/')) {
        places.folders.push_back(*home + "/.icons");
    }
    const auto data = variable("XDG_DATA_HOME");
    if (data && data->starts_with('/')) {
        addIconsFolder(places.folders, *data);
        addIconsFolder(places.folders, *data + "/flatpak/exports/share");
    } else if (home) {
        addIconsFolder(places.folders, *home + "/.local/share");
        addIconsFolder(places.folders, *home + "/.local/share/flatpak/exports/share");
    }
    const std::string system = variable("XDG_DATA_DIRS")
                                   .value_or(
                                       "/usr/local/share:/usr/share:"
                                       "/var/lib/flatpak/exports/share");
    for (std::size_t begin = 0; begin <= system.size();) {
        const std::size_t end = std::min(system.find(':', begin), system.size());
        addIconsFolder(places.folders, system.substr(begin, end - begin));
        begin = end + 1;
    }
    places.pixmaps = "/usr/share/pixmaps";
    places.theme = themeOf(variable);
    return places;
}

IconTheme::IconTheme(Places places) : places_(std::move(places)) {
    if (isPlainName(places_.theme)) {
        addTheme(places_.theme, 0);
    }
    addTheme(std::string(fallbackTheme), 0);
}

// The theme, then those it inherits, each once; hicolor comes last of all.
void IconTheme::addTheme(const std::string& name, unsigned depth) {
    const bool isKnown = std::ranges::find(themes_, name, &Theme::name) != themes_.end();
    if (isKnown || depth > deepestInheritance || !isPlainName(name)) {
        return;
    }
    KeyFile index;
    for (const std::string& folder : places_.folders) {
        index = index ? std::move(index) : readKeyFile(folder + "/" + name + "/index.theme");
    }
    Theme theme{name, {}};
    std::vector<std::string> inherited;
    if (index) {
        auto names = list(index.get(), "Icon Theme", "Directories");
        std::ranges::move(list(index.get(), "Icon Theme", "ScaledDirectories"),
                          std::back_inserter(names));
        for (const std::string& directory : names) {
            Directory made{.name = directory};
            made.size = number(index.get(), directory, "Size", 0);
            made.scale = number(index.get(), directory, "Scale", 1);
            made.minimum = number(index.get(), directory, "MinSize", made.size);
            made.maximum = number(index.get(), directory, "MaxSize", made.size);
            made.threshold = number(index.get(), directory, "Threshold", 2);
            const auto type = text(index.get(), directory.c_str(), "Type").value_or("");
            made.type = type == "Fixed"      ? Directory::Type::fixed
                        : type == "Scalable" ? Directory::Type::scalable
                                             : Directory::Type::threshold;
            if (made.size > 0) {
                theme.directories.push_back(std::move(made));
            }
        }
        inherited = list(index.get(), "Icon Theme", "Inherits");
    }
    themes_.push_back(std::move(theme));
    for (const std::string& parent : inherited) {
        if (parent != fallbackTheme) {
            addTheme(parent, depth + 1);
        }
    }
}

unsigned IconTheme::Directory::distance(unsigned pixels) const {
    switch (type) {
        case Type::fixed:
            return gap(size * scale, size * scale, pixels);
        case Type::scalable:
            return gap(minimum * scale, maximum * scale, pixels);
        case Type::threshold:
            break;
    }
    const unsigned low = size > threshold ? size - threshold : 1;
    return gap(low * scale, (size + threshold) * scale, pixels);
}

std::optional<std::string> IconTheme::find(std::string_view name, unsigned pixels) const {
    if (name.starts_with('/')) {
        return std::string(name);
    }
    if (!isPlainName(name)) {
        return std::nullopt;
    }
    for (const Theme& theme : themes_) {
        if (auto path = findIn(theme, name, pixels)) {
            return path;
        }
    }
    if (auto path = findPlain(name)) {
        return path;
    }
    for (const std::string_view extension : {".png", ".svg", ".xpm"}) {
        if (name.size() > extension.size() && name.ends_with(extension)) {
            return find(name.substr(0, name.size() - extension.size()), pixels);
        }
    }
    return std::nullopt;
}

// The nearest size; of equals the larger, then the one listed first.
std::optional<std::string> IconTheme::findIn(const Theme& theme, std::string_view name,
                                             unsigned pixels) const {
    std::optional<std::string> best;
    auto bestRank = std::pair(std::numeric_limits<unsigned>::max(), 0U);
    for (const Directory& directory : theme.directories) {
        const auto rank =
            std::pair(directory.distance(pixels),
                      std::numeric_limits<unsigned>::max() - directory.size * directory.scale);
        if (best && rank >= bestRank) {
            continue;
        }
        for (const std::string& folder : places_.folders) {
            const std::string base =
                folder + "/" + theme.name + "/" + directory.name + "/" + std::string(name);
            const auto found = std::ranges::find_if(extensions, [&](std::string_view extension) {
                return isReadable(base + std::string(extension));
            });
            if (found != extensions.end()) {
                best = base + std::string(*found);
                bestRank = rank;
                break;
            }
        }
    }
    return best;
}

std::optional<std::string> IconTheme::findPlain(std::string_view name) const {
    std::vector<std::string> folders = places_.folders;
    folders.push_back(places_.pixmaps);
    for (const std::string& folder : folders) {
        const std::string base = folder + "/" + std::string(name);
        for (const std::string_view extension : extensions) {
            if (isReadable(base + std::string(extension))) {
                return base + std::string(extension);
            }
        }
        if (name.ends_with(".png") || name.ends_with(".svg")) {
            if (isReadable(base)) {
                return base;
            }
        }
    }
    return std::nullopt;
}

}  // namespace marrowdale::native
