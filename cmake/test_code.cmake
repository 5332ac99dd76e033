# Common settings of test programs. Their speed does not matter, so they are compiled as fast as possible: without
# optimisation in a release build, and with one precompiled header for all of them (headers that tests use and that
# rarely change).
find_package(GTest REQUIRED)
include(GoogleTest)

# The main program of the tests; the precompiled header is made with it once and reused by the others.
add_library(mirevo_test_main STATIC ${PROJECT_SOURCE_DIR}/tests/main.cpp)
target_link_libraries(mirevo_test_main PUBLIC GTest::gmock fmt::fmt)
target_compile_options(mirevo_test_main PRIVATE $<$<CONFIG:Release>:-O0>)
target_precompile_headers(mirevo_test_main PRIVATE
  <algorithm> <array> <chrono> <cmath> <cstdlib> <cstring> <filesystem> <fstream> <functional> <limits> <map> <memory>
  <optional> <set> <sstream> <string> <string_view> <utility> <vector> <fmt/format.h> <gmock/gmock.h> <gtest/gtest.h>)

# Marks `target`, a program or part of one, as test code. Members of a struct that a test does not name keep their defaults.
function(mirevo_test_code target)
  target_include_directories(${target} PRIVATE ${PROJECT_SOURCE_DIR}/tests)
  target_link_libraries(${target} PRIVATE mirevo_test_main)
  target_compile_options(${target} PRIVATE $<$<CONFIG:Release>:-O0> -Wno-missing-field-initializers)
  target_precompile_headers(${target} REUSE_FROM mirevo_test_main)
  # The files of a program are compiled as one: names in their anonymous namespaces must differ.
  set_target_properties(${target} PROPERTIES UNITY_BUILD ON UNITY_BUILD_BATCH_SIZE 0)
endfunction()
