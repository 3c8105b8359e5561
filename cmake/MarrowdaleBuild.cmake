# Options, compiler settings and the two functions every folder's CMakeLists.txt is made of.

include(GNUInstallDirs)

option(MARROWDALE_TESTS "Build the tests" OFF)
option(MARROWDALE_FUZZ "Build the fuzzers (clang only)" OFF)
option(MARROWDALE_BENCHMARKS "Build the benchmarks" OFF)
option(MARROWDALE_PRECOMPILE "The headers that all tests use are read once for all of them" OFF)
set(MARROWDALE_TEST_BATCH 1 CACHE STRING "How many sources of a test program are compiled as one")
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
  -Wall -Wextra -Wpedantic -Werror
  # Of sources that are compiled as one, the names of one may well be used inside another.
  $<$<NOT:$<BOOL:$<TARGET_PROPERTY:UNITY_BUILD>>>:-Wshadow>
  -Wconversion -Wsign-conversion -Wnon-virtual-dtor
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
  # What is tested is optimised, for the tests' speed; the tests themselves, for the build's, are not.
  # Some of the libraries that tests use ask for -pthread; precompiled headers want it of all or none.
  set(test_options -O0 -pthread)
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # So as not to look for memory that could be used again: a tenth of the time.
    list(APPEND test_options --param=ggc-min-expand=1000 --param=ggc-min-heapsize=262144)
  endif()
  if(MARROWDALE_PRECOMPILE)
    # Made once, and so with exactly the options of the programs that read it.
    set(test_headers "${CMAKE_SOURCE_DIR}/tests/support/TestHeaders")
    add_library(marrowdale_test_headers OBJECT "${test_headers}.cpp")
    target_link_libraries(marrowdale_test_headers PRIVATE marrowdale_options GTest::gmock)
    target_compile_options(marrowdale_test_headers PRIVATE
      ${test_options} ${CMAKE_CXX_COMPILE_OPTIONS_PIE})
    set_target_properties(marrowdale_test_headers PROPERTIES POSITION_INDEPENDENT_CODE OFF)
    target_precompile_headers(marrowdale_test_headers PRIVATE "${test_headers}.h")
  endif()
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
  target_compile_options(${name} PRIVATE ${test_options})
  # Most of a test's compilation goes into headers and templates that the next one needs as well.
  if(MARROWDALE_TEST_BATCH GREATER 1)
    set_target_properties(${name} PROPERTIES
      UNITY_BUILD ON UNITY_BUILD_BATCH_SIZE ${MARROWDALE_TEST_BATCH})
  endif()
  if(MARROWDALE_PRECOMPILE)
    target_precompile_headers(${name} REUSE_FROM marrowdale_test_headers)
  endif()
  # Listed when ctest starts: which file systems a test runs on is known only then.
  gtest_discover_tests(${name} TEST_PREFIX "${name}." DISCOVERY_MODE PRE_TEST DISCOVERY_TIMEOUT 60
    PROPERTIES TIMEOUT 600)
endfunction()
