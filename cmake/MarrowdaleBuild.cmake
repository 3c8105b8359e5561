# Options, compiler settings and the two functions every folder's CMakeLists.txt is made of.

include(GNUInstallDirs)

option(MARROWDALE_TESTS "Build the tests" OFF)
option(MARROWDALE_FUZZ "Build the fuzzers (clang only)" OFF)
option(MARROWDALE_BENCHMARKS "Build the benchmarks" OFF)
option(MARROWDALE_PRECOMPILE "Test programs read the headers that all tests use once" OFF)
set(MARROWDALE_SANITIZE "" CACHE STRING "Value of -fsanitize=, empty for none")

set(CMAKE_CXX_STANDARD 23)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_CXX_SCAN_FOR_MODULES OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_RUNTIME_OUTPUT_DIRECTORY "${CMAKE_BINARY_DIR}/bin")

find_package(Threads REQUIRED)

# Every target of the project compiles with these; warnings are errors.
add_library(marrowdale_options INTERFACE)
target_include_directories(marrowdale_options INTERFACE "${CMAKE_SOURCE_DIR}")
target_compile_options(marrowdale_options INTERFACE
  -Wall -Wextra -Wpedantic -Werror -Wshadow -Wconversion -Wsign-conversion -Wnon-virtual-dtor
  -Wold-style-cast -Woverloaded-virtual -Wcast-qual -Wundef
  $<$<CXX_COMPILER_ID:Clang>:-Wthread-safety>
  # GCC 12 sees uninitialised reads in the library's own variants and expecteds that are none, and
  # overlaps in its string concatenation; clang looks for the real ones.
  $<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized -Wno-restrict>)
target_link_libraries(marrowdale_options INTERFACE Threads::Threads)
if(MARROWDALE_SANITIZE)
  add_compile_options(-fsanitize=${MARROWDALE_SANITIZE} -fno-omit-frame-pointer
                      -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${MARROWDALE_SANITIZE})
endif()
if(MARROWDALE_TESTS OR MARROWDALE_FUZZ)
  add_compile_definitions(_GLIBCXX_ASSERTIONS)
endif()

if(MARROWDALE_TESTS)
  enable_testing()
  find_package(GTest REQUIRED)
  include(GoogleTest)
endif()

# marrowdale_library(NAME [DEPENDS target...] [PRIVATE_DEPENDS target...] [TEST_DEPENDS target...])
#
# A static library marrowdale_NAME made of this folder's *.cpp, and, where tests are built, a
# program NAME_test made of its *Test.cpp. A folder without sources becomes an interface library.
function(marrowdale_library name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "" "DEPENDS;PRIVATE_DEPENDS;TEST_DEPENDS")
  file(GLOB sources CONFIGURE_DEPENDS "*.cpp")
  set(tests ${sources})
  list(FILTER sources EXCLUDE REGEX "Test\\.cpp$")
  list(FILTER tests INCLUDE REGEX "Test\\.cpp$")
  if(sources)
    add_library(marrowdale_${name} STATIC ${sources})
    target_link_libraries(marrowdale_${name}
      PUBLIC marrowdale_options ${arg_DEPENDS} PRIVATE ${arg_PRIVATE_DEPENDS})
  else()
    add_library(marrowdale_${name} INTERFACE)
    target_link_libraries(marrowdale_${name} INTERFACE marrowdale_options ${arg_DEPENDS})
  endif()
  if(MARROWDALE_TESTS AND tests)
    marrowdale_test(${name}_test SOURCES ${tests}
      DEPENDS marrowdale_${name} ${arg_TEST_DEPENDS})
  endif()
endfunction()

# marrowdale_test(NAME SOURCES file... [DEPENDS target...])
function(marrowdale_test name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "" "SOURCES;DEPENDS")
  add_executable(${name} ${arg_SOURCES})
  target_link_libraries(${name} PRIVATE ${arg_DEPENDS} GTest::gtest_main GTest::gmock)
  # What is tested is optimised, for the tests' speed; the tests themselves, for the build's, are not.
  target_compile_options(${name} PRIVATE -O0)
  if(MARROWDALE_PRECOMPILE)
    target_precompile_headers(${name} PRIVATE "${CMAKE_SOURCE_DIR}/tests/support/TestHeaders.h")
  endif()
  # Listed when ctest starts: which file systems a test runs on is known only then.
  gtest_discover_tests(${name} TEST_PREFIX "${name}." DISCOVERY_MODE PRE_TEST DISCOVERY_TIMEOUT 60
    PROPERTIES TIMEOUT 600)
endfunction()
