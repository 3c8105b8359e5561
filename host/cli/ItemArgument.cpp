#include "host/cli/ItemArgument.h"

#include <charconv>
#include <cstdlib>
#include <memory>

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

std::optional<std::string> resolved(const std::string& path) {
    struct Free {
        // NOLINTNEXTLINE(cppcoreguidelines-no-malloc): realpath allocates with malloc
        void operator()(char* text) const { std::free(text); }
    };
    const std::unique_ptr<char, Free> text(::realpath(path.c_str(), nullptr));
    return text ? std::optional<std::string>(text.get()) : std::nullopt;
}

std::string withoutTrailingSlashes(std::string path) {
    while (path.size() > 1 && path.ends_with('/')) {
        path.pop_back();
    }
    return path;
}

// The byte that a text begins with in the form \udcXX; none in any other form.
std::optional<char> writtenOutByte(std::string_view text) {
    const bool isSurrogate = text.size() >= 6 && text.starts_with("\\u") &&
                             (text[2] == 'd' || text[2] == 'D') &&
                             (text[3] == 'c' || text[3] == 'C');
    if (!isSurrogate) {
        return std::nullopt;
    }
    unsigned value = 0;
    const char* const end = text.data() + 6;
    const auto parsed = std::from_chars(text.data() + 4, end, value, 16);
    if (parsed.ptr != end || parsed.ec != std::errc() || value < 0x80) {
        return std::nullopt;
    }
    return static_cast<char>(value);
}

// The byte that a text begins with as the encoding of U+DC80 to U+DCFF; none for anything else.
std::optional<char> encodedByte(std::string_view text) {
    if (text.size() < 3 || text[0] != '\xED' || (text[1] != '\xB2' && text[1] != '\xB3')) {
        return std::nullopt;
    }
    const unsigned low = static_cast<unsigned char>(text[2]);
    const unsigned value = (text[1] == '\xB3' ? 0xC0U : 0x80U) | (low & 0x3FU);
    return (low & 0xC0U) == 0x80U ? std::optional<char>(static_cast<char>(value)) : std::nullopt;
}

}  // namespace

bool ItemArgument::isPath() const {
    return text_.starts_with('/') || text_.starts_with("./") || text_.starts_with("../");
}

Expected<std::string> ItemArgument::identifier(ItemRequests& requests,
                                               const Environment& environment) const {
    if (isPath()) {
        return identifierOfPath(text_, requests, environment);
    }
    if (text_ == "root") {
        return std::string(VantrelRootContainerItemIdentifier);
    }
    if (text_ == "working-set") {
        return std::string(VantrelWorkingSetContainerItemIdentifier);
    }
    if (text_ == "all-directories") {
        return std::string(VantrelAllDirectoriesContainerItemIdentifier);
    }
    return text_;
}

Expected<std::string> identifierOfPath(std::string_view path, ItemRequests& requests,
                                       const Environment& environment) {
    // As the system has it, an empty path is no place; it is not the working folder.
    if (path.empty()) {
        return Unexpected(errorForNonExistentItem(path));
    }
    auto identifier = requests.identifierAt(entryPath(path, environment));
    if (identifier || identifier.error() != errorForNonExistentItem({})) {
        return identifier;
    }
    // The name as it stands was tried first: it may really hold such a text.
    if (const auto bytes = withBytesOfSurrogates(path)) {
        if (auto itsOwn = requests.identifierAt(entryPath(*bytes, environment))) {
            return itsOwn;
        }
    }
    return Unexpected(errorForNonExistentItem(path));
}

std::string entryPath(std::string_view path, const Environment& environment) {
    const std::string absolute = withoutTrailingSlashes(environment.absolutePath(path));
    const auto slash = absolute.rfind('/');
    const std::string name = absolute.substr(slash + 1);
    if (name.empty() || name == "." || name == "..") {
        return resolved(absolute).value_or(URL::fileURL(absolute).standardized().path());
    }
    const auto folder = resolved(absolute.substr(0, slash + 1));
    if (!folder) {
        return URL::fileURL(absolute).standardized().path();
    }
    return *folder == "/" ? "/" + name : *folder + "/" + name;
}

std::optional<std::string> withBytesOfSurrogates(std::string_view text) {
    std::string bytes;
    bool found = false;
    while (!text.empty()) {
        if (const auto written = writtenOutByte(text)) {
            bytes += *written;
            text.remove_prefix(6);
            found = true;
        } else if (const auto encoded = encodedByte(text)) {
            bytes += *encoded;
            text.remove_prefix(3);
            found = true;
        } else {
            bytes += text.front();
            text.remove_prefix(1);
        }
    }
    return found ? std::optional(std::move(bytes)) : std::nullopt;
}

}  // namespace marrowdale::host
