# SPDX-License-Identifier: MIT
# Declares the project's targets: one library a folder, alias orin::<name>.

find_package(OpenMP REQUIRED COMPONENTS CXX)
include(OrinFlags)

# orin_library(<name> SOURCES ... HEADERS ... LINKS ... [PRIVATE_LINKS ...])
# HEADERS are public: they are installed under their path in the tree, and each compiles alone.
function(orin_library name)
  cmake_parse_arguments(ARG "" "" "SOURCES;HEADERS;LINKS;PRIVATE_LINKS" ${ARGN})
  set(target orin_${name})
  if(ARG_SOURCES)
    add_library(${target} ${ARG_SOURCES})
    set(scope PUBLIC)
    target_link_libraries(${target} PRIVATE $<BUILD_INTERFACE:orin_flags> ${ARG_PRIVATE_LINKS})
  else()
    add_library(${target} INTERFACE)
    set(scope INTERFACE)
  endif()
  add_library(orin::${name} ALIAS ${target})
  target_compile_features(${target} ${scope} cxx_std_20)
  target_sources(${target}
    ${scope} FILE_SET HEADERS BASE_DIRS ${PROJECT_SOURCE_DIR} FILES ${ARG_HEADERS})
  target_link_libraries(${target} ${scope} ${ARG_LINKS})
  set_target_properties(${target} PROPERTIES EXPORT_NAME ${name} POSITION_INDEPENDENT_CODE ON)
  set_property(GLOBAL APPEND PROPERTY ORIN_LIBRARIES ${target})
endfunction()
