# What ./run package packs, besides what the targets install: the trainer, the farm, the example of the demo and the documents, as
# an archive that can be unpacked anywhere (TGZ) and as a Debian package (DEB) in a folder of its own.
set(_nw_data_dir "${CMAKE_INSTALL_DATADIR}/neuralWarp")

file(GLOB _trainer_sources CONFIGURE_DEPENDS trainer/*.py)
install(FILES ${_trainer_sources} DESTINATION "${_nw_data_dir}/trainer")
install(FILES pyproject.toml setup.py VERSION LICENSE DESTINATION "${_nw_data_dir}")
install(PROGRAMS scripts/neuralwarp-train DESTINATION "${CMAKE_INSTALL_BINDIR}")
install(DIRECTORY clients/farm/neuralwarp_farm DESTINATION "${_nw_data_dir}/clients/farm" PATTERN __pycache__ EXCLUDE)
install(PROGRAMS clients/farm/neuralwarp-farm DESTINATION "${CMAKE_INSTALL_BINDIR}")
install(DIRECTORY examples/hand examples/arm examples/blender DESTINATION "${_nw_data_dir}/examples"
  PATTERN __pycache__ EXCLUDE)
install(DIRECTORY docs/ DESTINATION "${CMAKE_INSTALL_DOCDIR}")
install(FILES docs/installed.md DESTINATION "${CMAKE_INSTALL_DOCDIR}" RENAME README.md)

set(CPACK_PACKAGE_NAME neuralWarp)
set(CPACK_PACKAGE_VENDOR "the developers of neuralWarp")
set(CPACK_PACKAGE_CONTACT "the developers of neuralWarp")
set(CPACK_PACKAGE_DIRECTORY "${PROJECT_BINARY_DIR}/packages")
set(CPACK_PACKAGE_FILE_NAME "neuralWarp-${PROJECT_VERSION}-${CMAKE_SYSTEM_NAME}-${CMAKE_SYSTEM_PROCESSOR}")
set(CPACK_GENERATOR TGZ DEB)
set(CPACK_STRIP_FILES ON)
set(CPACK_PROJECT_CONFIG_FILE "${CMAKE_CURRENT_LIST_DIR}/package_place.cmake")
set(CPACK_PRE_BUILD_SCRIPTS "${CMAKE_CURRENT_LIST_DIR}/package_extras.cmake")
set(CPACK_RESOURCE_FILE_README "${PROJECT_SOURCE_DIR}/docs/installed.md")

# The libraries of the package are its own affair, and lie where no other program looks for them.
set(CPACK_DEBIAN_PACKAGE_NAME neuralwarp)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION graphics)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
get_target_property(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS OpenQuarn BINARY_DIR)
if(OnnxRuntime_LIBRARY)
  cmake_path(GET OnnxRuntime_LIBRARY PARENT_PATH _onnx_folder)
  list(APPEND CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS "${_onnx_folder}")
endif()
string(JOIN ", " CPACK_DEBIAN_PACKAGE_DEPENDS "python3 (>= 3.9)" python3-torch python3-onnx python3-numpy python3-scipy
  python3-tqdm python3-matplotlib python3-xxhash)
string(JOIN ", " CPACK_DEBIAN_PACKAGE_RECOMMENDS libopenblas0-pthread pocl-opencl-icd)
include(CPack)
