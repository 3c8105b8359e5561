#include "host/daemon/Mounts.h"

#include <algorithm>
#include <fstream>
#include <ranges>
#include <sstream>
#include <utility>
#include <vector>

namespace marrowdale::host {

namespace {

bool isOctal(char c) {
    return c >= '0' && c <= '7';
}

// The table writes blanks and the like as a backslash and three octal digits.
std::string withoutOctalEscapes(std::string_view text) {
    std::string out;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '\\' && i + 3 < text.size() && isOctal(text[i + 1]) &&
            isOctal(text[i + 2]) && isOctal(text[i + 3])) {
            out += static_cast<char>((text[i + 1] - '0') * 64 + (text[i + 2] - '0') * 8 +
                                     (text[i + 3] - '0'));
            i += 3;
        } else {
            out += text[i];
        }
    }
    return out;
}

std::vector<std::string_view> words(std::string_view line) {
    std::vector<std::string_view> result;
    for (const auto word : std::views::split(line, ' ')) {
        result.emplace_back(word.begin(), word.end());
    }
    return result;
}

bool hasOption(std::string_view options, std::string_view wanted) {
    return std::ranges::any_of(std::views::split(options, ','), [&](const auto option) {
        return std::string_view(option.begin(), option.end()) == wanted;
    });
}

// "36 35 98:0 /mnt1 /mnt2 rw,noatime master:1 - ext3 /dev/root rw,errors=continue"
std::optional<Mount> parsed(std::string_view line) {
    const auto fields = words(line);
    const auto dash = std::ranges::find(fields, "-");
    if (fields.size() < 6 || fields.end() - dash < 4) {
        return std::nullopt;
    }
    return Mount{withoutOctalEscapes(fields[4]), std::string(dash[1]), withoutOctalEscapes(dash[2]),
                 hasOption(fields[5], "ro") || hasOption(dash[3], "ro")};
}

bool liesBelow(std::string_view path, std::string_view folder) {
    return folder == "/" ? path != "/"
                         : path.starts_with(folder) && path.substr(folder.size()).starts_with('/');
}

bool holds(const Mount& mount, std::string_view path) {
    return path == mount.point || liesBelow(path, mount.point);
}

std::string kernelTable() {
    std::ifstream file("/proc/self/mountinfo", std::ios::binary);
    // As far as it can be read: the stream's own iterators would throw.
    std::ostringstream text;
    text << file.rdbuf();
    return std::move(text).str();
}

}  // namespace

std::optional<Mount> mountOf(std::string_view path, std::string_view table) {
    std::optional<Mount> best;
    for (const auto line : std::views::split(table, '\n')) {
        auto mount = parsed(std::string_view(line.begin(), line.end()));
        // Of two on one point the later covers the earlier.
        if (mount && holds(*mount, path) && (!best || mount->point.size() >= best->point.size())) {
            best = std::move(mount);
        }
    }
    return best;
}

std::optional<Mount> mountOf(std::string_view path) {
    return mountOf(path, kernelTable());
}

std::vector<std::string> mountsBelow(std::string_view folder, std::string_view table) {
    std::vector<std::string> points;
    for (const auto line : std::views::split(table, '\n')) {
        auto mount = parsed(std::string_view(line.begin(), line.end()));
        if (mount && liesBelow(mount->point, folder)) {
            points.push_back(std::move(mount->point));
        }
    }
    std::ranges::sort(points);
    std::vector<std::string> outermost;
    for (std::string& point : points) {
        const bool isKnown = std::ranges::any_of(outermost, [&](const std::string& outer) {
            return point == outer || liesBelow(point, outer);
        });
        if (!isKnown) {
            outermost.push_back(std::move(point));
        }
    }
    return outermost;
}

std::vector<std::string> mountsBelow(std::string_view folder) {
    return mountsBelow(folder, kernelTable());
}

}  // namespace marrowdale::host
