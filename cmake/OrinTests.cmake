# SPDX-License-Identifier: MIT
# Declares test programs.

include(GoogleTest)
find_package(GTest REQUIRED)

# orin_test(<name> SOURCES ... LINKS ...): one GoogleTest program, its tests registered one by one.
function(orin_test name)
  cmake_parse_arguments(ARG "" "" "SOURCES;LINKS" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE orin_flags ${ARG_LINKS} GTest::gmock GTest::gtest_main)
  target_include_directories(${name} PRIVATE ${PROJECT_SOURCE_DIR})
  # Tests are large and short-lived: what they test is optimised, they themselves compile fast.
  target_compile_options(${name} PRIVATE "$<$<CONFIG:RelWithDebInfo>:-O1;-g1>")
  # Teams larger than the machine: threads that wait must sleep, or each region costs milliseconds.
  gtest_discover_tests(${name} DISCOVERY_TIMEOUT 60
    PROPERTIES TIMEOUT 300 ENVIRONMENT OMP_WAIT_POLICY=passive)
endfunction()
