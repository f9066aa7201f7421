# The installed package: find_package(neuralWarp) gives the targets of the export set neuralWarpTargets.
include(CMakePackageConfigHelpers)

set(_nw_package_dir "${CMAKE_INSTALL_LIBDIR}/cmake/neuralWarp")

configure_package_config_file("${CMAKE_CURRENT_LIST_DIR}/neuralWarpConfig.cmake.in"
  "${PROJECT_BINARY_DIR}/neuralWarpConfig.cmake" INSTALL_DESTINATION "${_nw_package_dir}")
write_basic_package_version_file("${PROJECT_BINARY_DIR}/neuralWarpConfigVersion.cmake"
  COMPATIBILITY SameMinorVersion)

install(EXPORT neuralWarpTargets NAMESPACE neuralWarp:: DESTINATION "${_nw_package_dir}")
install(FILES
  "${PROJECT_BINARY_DIR}/neuralWarpConfig.cmake" "${PROJECT_BINARY_DIR}/neuralWarpConfigVersion.cmake"
  DESTINATION "${_nw_package_dir}")
install(FILES "${PROJECT_SOURCE_DIR}/LICENSE" DESTINATION "${CMAKE_INSTALL_DOCDIR}")
