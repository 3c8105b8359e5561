#pragma once

#include <span>
#include <string_view>

namespace marrowdale::host {

// A file of the document browser's page, which is part of the program.
struct StaticFile {
    std::string_view path;  // in requests, without the leading slash: "assets/main.js"
    std::string_view contentType;
    std::string_view tag;  // an entity tag; changes with the bytes
    std::string_view bytes;
};

// All of them; made from web/ by the build.
[[nodiscard]] std::span<const StaticFile> staticFiles();

// Null where there is none.
[[nodiscard]] const StaticFile* staticFileAt(std::string_view path);

}  // namespace marrowdale::host
