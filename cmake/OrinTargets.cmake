# SPDX-License-Identifier: MIT
# Declares the project's targets: one library a folder, alias orin::<name>.

find_package(OpenMP REQUIRED COMPONENTS CXX)

# Flags that every translation unit of the project is built with.
add_library(orin_flags INTERFACE)
target_compile_features(orin_flags INTERFACE cxx_std_20)
target_compile_options(orin_flags INTERFACE
  -ffp-contract=off   # pixels are the same bits on every compiler and processor
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Woverloaded-virtual)

# orin_library(<name> SOURCES ... HEADERS ... LINKS ... [PRIVATE_LINKS ...])
function(orin_library name)
  cmake_parse_arguments(ARG "" "" "SOURCES;HEADERS;LINKS;PRIVATE_LINKS" ${ARGN})
  set(target orin_${name})
  if(ARG_SOURCES)
    add_library(${target} ${ARG_SOURCES})
    set(scope PUBLIC)
    target_link_libraries(${target} PRIVATE $<BUILD_INTERFACE:orin_flags> ${ARG_PRIVATE_LINKS})
    target_compile_features(${target} PUBLIC cxx_std_20)
  else()
    add_library(${target} INTERFACE)
    set(scope INTERFACE)
    target_compile_features(${target} INTERFACE cxx_std_20)
  endif()
  add_library(orin::${name} ALIAS ${target})
  target_include_directories(${target} ${scope}
    $<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}>
    $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}/orin-overviews>)
  target_link_libraries(${target} ${scope} ${ARG_LINKS})
  set_target_properties(${target} PROPERTIES EXPORT_NAME ${name} POSITION_INDEPENDENT_CODE ON)
  set_property(GLOBAL APPEND PROPERTY ORIN_LIBRARIES ${target})
  foreach(header ${ARG_HEADERS})
    set_property(GLOBAL APPEND PROPERTY ORIN_PUBLIC_HEADERS
      ${CMAKE_CURRENT_SOURCE_DIR}/${header})
  endforeach()
endfunction()
