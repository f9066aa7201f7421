# The installed host: find_package(OpenQuarn) gives the target OpenQuarn::OpenQuarn and the function openquarn_plugin().
include(CMakePackageConfigHelpers)

set(_openquarn_package_dir "${CMAKE_INSTALL_LIBDIR}/cmake/OpenQuarn")

install(TARGETS OpenQuarn EXPORT OpenQuarnTargets DESTINATION "${CMAKE_INSTALL_LIBDIR}")
nw_link_runpath(OpenQuarn)
install(DIRECTORY host/api/openquarn host/helpers/openquarn_helpers host/runtime/application/openquarn_app
  DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}" FILES_MATCHING PATTERN "*.h")

install(FILES host/gdb/openquarn.py DESTINATION "${CMAKE_INSTALL_DATADIR}/OpenQuarn/gdb")

configure_package_config_file("${CMAKE_CURRENT_LIST_DIR}/OpenQuarnConfig.cmake.in"
  "${PROJECT_BINARY_DIR}/OpenQuarnConfig.cmake" INSTALL_DESTINATION "${_openquarn_package_dir}")
write_basic_package_version_file("${PROJECT_BINARY_DIR}/OpenQuarnConfigVersion.cmake"
  COMPATIBILITY SameMinorVersion)
install(EXPORT OpenQuarnTargets NAMESPACE OpenQuarn:: DESTINATION "${_openquarn_package_dir}")
install(FILES
  "${PROJECT_BINARY_DIR}/OpenQuarnConfig.cmake" "${PROJECT_BINARY_DIR}/OpenQuarnConfigVersion.cmake"
  cmake/OpenQuarnPlugin.cmake cmake/openquarn_plugin.map
  DESTINATION "${_openquarn_package_dir}")
