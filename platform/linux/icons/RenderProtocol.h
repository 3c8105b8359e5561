#pragma once

#include <string_view>

namespace marrowdale::native {

// How the program that draws icons is asked: two arguments, the size of the square in pixels and
// one of these words; the file to draw on standard input, which is a file. It writes the picture in
// the cached-bitmap form on standard output, and ends with 0, or writes nothing and ends with:
inline constexpr std::string_view renderEnlarging = "enlarging";
inline constexpr std::string_view renderExact = "exact";
inline constexpr int renderNoPicture = 1;
inline constexpr int renderWrongUse = 2;
inline constexpr int renderTooSmall = 3;  // and "exact" was asked for

}  // namespace marrowdale::native
