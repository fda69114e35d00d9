# SPDX-License-Identifier: MIT
# Installs the tool (component `orin-overviews`) and the libraries with what a program needs to use
# them (component `orin-overviews-dev`). Included last, when all targets are known.

include(CMakePackageConfigHelpers)

set(orin_include_dir ${CMAKE_INSTALL_INCLUDEDIR}/orin-overviews)
set(orin_package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/OrinOverviews)
get_property(orin_libraries GLOBAL PROPERTY ORIN_LIBRARIES)

install(TARGETS orin-overviews
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT orin-overviews)
install(TARGETS ${orin_libraries} EXPORT OrinOverviews
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT orin-overviews-dev
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT orin-overviews-dev
  FILE_SET HEADERS DESTINATION ${orin_include_dir} COMPONENT orin-overviews-dev)

# find_package(OrinOverviews)
install(EXPORT OrinOverviews NAMESPACE orin:: FILE OrinOverviewsTargets.cmake
  DESTINATION ${orin_package_dir} COMPONENT orin-overviews-dev)
configure_package_config_file(
  ${PROJECT_SOURCE_DIR}/packaging/OrinOverviewsConfig.cmake.in OrinOverviewsConfig.cmake
  INSTALL_DESTINATION ${orin_package_dir})
write_basic_package_version_file(OrinOverviewsConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES
  ${PROJECT_BINARY_DIR}/OrinOverviewsConfig.cmake
  ${PROJECT_BINARY_DIR}/OrinOverviewsConfigVersion.cmake
  DESTINATION ${orin_package_dir} COMPONENT orin-overviews-dev)

# pkg-config orin-overviews: a static linker wants users before what they use, the reverse of the
# order in which the folders are added.
set(ORIN_PC_LIBRARIES "")
foreach(library ${orin_libraries})
  get_target_property(type ${library} TYPE)
  if(NOT type STREQUAL "INTERFACE_LIBRARY")
    string(PREPEND ORIN_PC_LIBRARIES "-l${library} ")
  endif()
endforeach()
set(ORIN_PC_MODULES "")   # where they are, and what they need from the program
if(TARGET orin_gdal_module)
  set(modules "\${libdir}/orin-overviews")
  string(CONCAT ORIN_PC_MODULES
    " -Wl,--export-dynamic-symbol-list=${modules}/shared-symbols.txt -Wl,-rpath,${modules}")
endif()
file(RELATIVE_PATH ORIN_PC_PREFIX   # ends with a slash
  /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(${PROJECT_SOURCE_DIR}/packaging/orin-overviews.pc.in orin-overviews.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/orin-overviews.pc
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT orin-overviews-dev)
