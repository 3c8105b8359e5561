# cmake -D OUTPUT=file.cpp -D FOLDER=web -P EmbedFiles.cmake
#
# Writes a source file with the bytes of the page's files, so that the program needs none of them
# when it runs. web/index.html is served as "", the others as assets/NAME.

file(GLOB files RELATIVE "${FOLDER}" "${FOLDER}/*.html" "${FOLDER}/*.css" "${FOLDER}/*.js"
     "${FOLDER}/*.svg")
list(SORT files)

set(types_html "text/html; charset=utf-8")
set(types_css "text/css; charset=utf-8")
set(types_js "text/javascript; charset=utf-8")
set(types_svg "image/svg+xml")

set(arrays "")
set(entries "")
set(number 0)
foreach(name IN LISTS files)
  file(READ "${FOLDER}/${name}" hex HEX)
  file(SHA256 "${FOLDER}/${name}" sum)
  string(SUBSTRING "${sum}" 0 16 sum)
  string(REGEX REPLACE "([0-9a-f][0-9a-f])" "\\\\x\\1" bytes "${hex}")
  # One literal a line; a longer one than compilers must take is put together from these.
  string(REGEX REPLACE "((\\\\x[0-9a-f][0-9a-f])(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?(\\\\x[0-9a-f][0-9a-f])?)" "    \"\\1\"\n" bytes "${bytes}")
  string(REGEX MATCH "[a-z]+$" extension "${name}")
  if(name STREQUAL "index.html")
    set(path "")
  else()
    set(path "assets/${name}")
  endif()
  string(APPEND arrays "constexpr std::string_view file${number}(\n${bytes}    \"\",\n    ${number}u + size${number});\n")
  string(LENGTH "${hex}" digits)
  math(EXPR size "${digits} / 2")
  string(REPLACE "${number}u + size${number}" "${size}" arrays "${arrays}")
  string(APPEND entries
    "    {\"${path}\", \"${types_${extension}}\", \"\\\"${sum}\\\"\", file${number}},\n")
  math(EXPR number "${number} + 1")
endforeach()

file(WRITE "${OUTPUT}" "// Made from web/ by cmake/EmbedFiles.cmake.
#include \"host/browser/StaticFiles.h\"

namespace marrowdale::host {

namespace {

${arrays}
constexpr StaticFile files[] = {
${entries}};

}  // namespace

std::span<const StaticFile> staticFiles() {
    return files;
}

}  // namespace marrowdale::host
")
