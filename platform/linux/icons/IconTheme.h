#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale::native {

// Finds icons by their names, as the icon theme specification has it: in the user's theme, in the
// themes it inherits, in hicolor, and at last in the folder of plain pictures. PNG and SVG files
// are found. The themes are read once, when this is made; files are looked for when they are asked
// for. Immutable; any thread.
class IconTheme {
  public:
    struct Places {
        // Folders of themes, the one to look in first in front.
        std::vector<std::string> folders;
        std::string pixmaps;  // "/usr/share/pixmaps"
        std::string theme;    // the user's; empty for hicolor alone
    };
    // By the environment: ~/.icons, then "icons" in $XDG_DATA_HOME and $XDG_DATA_DIRS; the theme is
    // MARROWDALE_ICON_THEME, else what the session's settings for toolkits name
    // ($XDG_CONFIG_HOME/gtk-3.0/settings.ini), else Adwaita.
    [[nodiscard]] static Places placesFor(
        const std::function<std::optional<std::string>(std::string_view name)>& variable);

    explicit IconTheme(Places places);

    // The file that suits a size in pixels best; none where no theme has the icon. A name that is
    // an absolute path is that file, whatever it is. A name with an extension that files have is
    // looked for without it too.
    [[nodiscard]] std::optional<std::string> find(std::string_view name, unsigned pixels) const;

  private:
    // A folder of one size of icons.
    struct Directory {
        std::string name;  // below the theme's folder
        unsigned size = 0;
        unsigned scale = 1;
        unsigned minimum = 0;
        unsigned maximum = 0;
        enum class Type { fixed, scalable, threshold } type = Type::threshold;
        unsigned threshold = 2;

        [[nodiscard]] unsigned distance(unsigned pixels) const;
    };
    struct Theme {
        std::string name;
        std::vector<Directory> directories;
    };
    void addTheme(const std::string& name, unsigned depth);
    [[nodiscard]] std::optional<std::string> findIn(const Theme& theme, std::string_view name,
                                                    unsigned pixels) const;
    [[nodiscard]] std::optional<std::string> findPlain(std::string_view name) const;

    const Places places_;
    std::vector<Theme> themes_;  // in the order in which they are looked at
};

}  // namespace marrowdale::native
