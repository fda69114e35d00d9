# SPDX-License-Identifier: MIT
# The flags that every translation unit of the project is built with, in one target.

set(ORIN_SANITIZE "" CACHE STRING
  "Sanitizers: empty, address (with undefined), thread or fuzzer (address with its engine)")
set_property(CACHE ORIN_SANITIZE PROPERTY STRINGS "" address thread fuzzer)
option(ORIN_COVERAGE "Count which lines run" OFF)

add_library(orin_flags INTERFACE)
target_compile_features(orin_flags INTERFACE cxx_std_20)
target_compile_options(orin_flags INTERFACE
  -ffp-contract=off   # pixels are the same bits on every compiler and processor
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Woverloaded-virtual
  $<$<CONFIG:RelWithDebInfo>:-UNDEBUG>   # people develop in it: assertions stay on
  $<$<CONFIG:RelWithDebInfo>:-D_GLIBCXX_ASSERTIONS>)

if(ORIN_SANITIZE STREQUAL "address")
  set(orin_sanitizers -fsanitize=address,undefined,float-cast-overflow)
elseif(ORIN_SANITIZE STREQUAL "thread")
  set(orin_sanitizers -fsanitize=thread)
elseif(ORIN_SANITIZE STREQUAL "fuzzer")   # needs clang; targets link the engine's main themselves
  set(orin_sanitizers -fsanitize=fuzzer-no-link,address,undefined,float-cast-overflow)
elseif(ORIN_SANITIZE)
  message(FATAL_ERROR "ORIN_SANITIZE is \"${ORIN_SANITIZE}\"; it may be empty, address, thread or "
    "fuzzer.")
endif()
if(ORIN_SANITIZE)
  target_compile_options(orin_flags INTERFACE
    ${orin_sanitizers}
    -fno-sanitize-recover=all   # a finding ends the program, so that its test fails
    -fno-omit-frame-pointer)
  target_link_options(orin_flags INTERFACE ${orin_sanitizers})
endif()
if(ORIN_COVERAGE)
  target_compile_options(orin_flags INTERFACE --coverage)
  target_link_options(orin_flags INTERFACE --coverage)
endif()
