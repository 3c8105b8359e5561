#include "platform/linux/files/MimeTypes.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <fstream>
#include <optional>
#include <set>
#include <sstream>
#include <utility>

namespace marrowdale::native {

namespace {

std::string variable(const char* name) {
    const char* value = std::getenv(name);  // NOLINT(concurrency-mt-unsafe)
    return value != nullptr ? value : "";
}

std::string contentsOf(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    // As far as it can be read: the stream's own iterators would throw.
    std::ostringstream text;
    text << file.rdbuf();
    return std::move(text).str();
}

// Takes the text up to the first `separator` off `rest`.
std::string_view take(std::string_view& rest, char separator) {
    const std::size_t end = std::min(rest.find(separator), rest.size());
    const std::string_view part = rest.substr(0, end);
    rest.remove_prefix(std::min(end + 1, rest.size()));
    return part;
}

template <typename Handle>
void forEachLine(const std::string& text, const Handle& handle) {
    std::string_view rest = text;
    while (!rest.empty()) {
        const std::string_view line = take(rest, '\n');
        if (!line.empty() && line.front() != '#') {
            handle(line);
        }
    }
}

struct GlobLine {
    int weight = 0;
    std::string_view type;
    std::string_view glob;
    MimeGlobs::Case caseRule = MimeGlobs::Case::insensitive;
};

// "weight:type:glob" and, in later versions, ":flags" with the flags separated by commas.
std::optional<GlobLine> parseGlobLine(std::string_view rest) {
    GlobLine line;
    const std::string_view weight = take(rest, ':');
    line.type = take(rest, ':');
    line.glob = take(rest, ':');
    std::string_view flags = take(rest, ':');
    while (!flags.empty()) {
        if (take(flags, ',') == "cs") {
            line.caseRule = MimeGlobs::Case::sensitive;
        }
    }
    const auto read = std::from_chars(weight.data(), weight.data() + weight.size(), line.weight);
    if (read.ec != std::errc() || line.type.empty() || line.glob.empty()) {
        return std::nullopt;
    }
    return line;
}

}  // namespace

std::vector<std::string> MimeTypes::systemFolders() {
    std::string home = variable("XDG_DATA_HOME");
    if (home.empty()) {
        home = variable("HOME") + "/.local/share";
    }
    std::string dirs = variable("XDG_DATA_DIRS");
    if (dirs.empty()) {
        dirs = "/usr/local/share:/usr/share";
    }
    std::vector<std::string> folders{home + "/mime"};
    std::string_view rest = dirs;
    while (!rest.empty()) {
        // A relative folder is no folder here, as the base-directory rules have it.
        if (const std::string_view dir = take(rest, ':'); dir.starts_with('/')) {
            folders.push_back(std::string(dir) + "/mime");
        }
    }
    return folders;
}

MimeTypes::MimeTypes(const std::vector<std::string>& folders) {
    readGlobs(folders);
    for (const std::string& folder : folders) {
        readSubclasses(folder);
        readAliases(folder);
    }
}

std::string_view MimeTypes::typeForName(std::string_view name) const {
    const std::string_view type = globs_.find(name);
    return type.empty() ? unknown : type;
}

bool MimeTypes::conformsTo(std::string_view type, std::string_view super) const {
    const std::string_view wanted = unaliased(super);
    std::vector<std::string_view> reached{unaliased(type)};
    for (std::size_t i = 0; i < reached.size(); ++i) {
        const std::string_view at = reached[i];
        if (at == wanted || (wanted == "text/plain" && at.starts_with("text/")) ||
            (wanted == unknown && !at.starts_with("inode/"))) {
            return true;
        }
        const auto parents = parents_.find(at);
        if (parents == parents_.end()) {
            continue;
        }
        for (const std::string_view parent : parents->second) {
            // Looked at once each: the data may hold a circle.
            if (std::ranges::find(reached, unaliased(parent)) == reached.end()) {
                reached.push_back(unaliased(parent));
            }
        }
    }
    return false;
}

std::string_view MimeTypes::intern(std::string_view type) {
    const auto known = interned_.find(type);
    if (known != interned_.end()) {
        return known->second;
    }
    const std::string_view text = texts_.emplace_back(type);
    interned_.emplace(text, text);
    return text;
}

void MimeTypes::readGlobs(const std::vector<std::string>& folders) {
    // A type whose globs a folder replaces takes none from the folders behind it.
    std::set<std::string_view> closed;
    for (const std::string& folder : folders) {
        std::set<std::string_view> closing;
        std::set<std::pair<std::string_view, std::string_view>> flagged;
        const std::string contents = contentsOf(folder + "/globs2");
        forEachLine(contents, [&](std::string_view text) {
            const auto line = parseGlobLine(text);
            if (!line || closed.contains(line->type)) {
                return;
            }
            // Each line with flags is there once more without, for readers that know no flags.
            if (line->caseRule == MimeGlobs::Case::sensitive) {
                flagged.emplace(line->type, line->glob);
            } else if (flagged.contains({line->type, line->glob})) {
                return;
            }
            const std::string_view type = intern(line->type);
            if (line->glob == "__NOGLOBS__") {
                closing.insert(type);
            } else {
                globs_.add(line->glob, type, line->weight, line->caseRule);
            }
        });
        closed.insert(closing.begin(), closing.end());
    }
    globs_.freeze();
}

void MimeTypes::readSubclasses(const std::string& folder) {
    forEachLine(contentsOf(folder + "/subclasses"), [&](std::string_view line) {
        const std::string_view type = take(line, ' ');
        if (!line.empty()) {
            parents_[intern(type)].push_back(intern(line));
        }
    });
}

void MimeTypes::readAliases(const std::string& folder) {
    forEachLine(contentsOf(folder + "/aliases"), [&](std::string_view line) {
        const std::string_view alias = take(line, ' ');
        if (!line.empty()) {
            aliases_.emplace(intern(alias), intern(line));
        }
    });
}

std::string_view MimeTypes::unaliased(std::string_view type) const {
    const auto alias = aliases_.find(type);
    return alias == aliases_.end() ? type : alias->second;
}

}  // namespace marrowdale::native
