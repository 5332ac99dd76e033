# What test programs have in common. Their code is never measured, so it is compiled as fast as can be: without optimisation
# in a release build, and with one precompiled header for all of them (the headers that tests use and that seldom change).
find_package(GTest REQUIRED)
include(GoogleTest)

# The main program of the tests; the precompiled header is made with it, once, and lent to the others.
add_library(mirevo_test_main STATIC ${PROJECT_SOURCE_DIR}/tests/main.cpp)
target_link_libraries(mirevo_test_main PUBLIC GTest::gmock fmt::fmt)
target_compile_options(mirevo_test_main PRIVATE $<$<CONFIG:Release>:-O0>)
target_precompile_headers(mirevo_test_main PRIVATE
  <algorithm> <array> <chrono> <cmath> <cstdlib> <cstring> <filesystem> <fstream> <functional> <limits> <map> <memory>
  <optional> <set> <sstream> <string> <string_view> <utility> <vector> <fmt/format.h> <gmock/gmock.h> <gtest/gtest.h>)

# Makes `target` a program, or a part of one, that is test code. What a test does not name of a struct is as it is by default.
function(mirevo_test_code target)
  target_include_directories(${target} PRIVATE ${PROJECT_SOURCE_DIR}/tests)
  target_link_libraries(${target} PRIVATE mirevo_test_main)
  target_compile_options(${target} PRIVATE $<$<CONFIG:Release>:-O0> -Wno-missing-field-initializers)
  target_precompile_headers(${target} REUSE_FROM mirevo_test_main)
endfunction()
