# Finds ONNX Runtime and defines OnnxRuntime::OnnxRuntime. In this order:
#   1. a CMake package named onnxruntime (CMAKE_PREFIX_PATH),
#   2. ONNXRUNTIME_ROOT, a CMake or environment variable: a folder with include/ and lib/,
#   3. build/deps/onnxruntime, which `./run deps` fills.
# Also sets OnnxRuntime_LICENSE_FILE when the root holds one; it is installed along with the library.

find_package(onnxruntime CONFIG QUIET)
if(TARGET onnxruntime::onnxruntime)
  if(NOT TARGET OnnxRuntime::OnnxRuntime)
    add_library(OnnxRuntime::OnnxRuntime INTERFACE IMPORTED)
    target_link_libraries(OnnxRuntime::OnnxRuntime INTERFACE onnxruntime::onnxruntime)
  endif()
  set(OnnxRuntime_FOUND TRUE)
  return()
endif()

set(_ort_roots "${ONNXRUNTIME_ROOT}" "$ENV{ONNXRUNTIME_ROOT}" "${PROJECT_SOURCE_DIR}/build/deps/onnxruntime")
find_path(OnnxRuntime_INCLUDE_DIR onnxruntime_cxx_api.h
  HINTS ${_ort_roots} PATH_SUFFIXES include include/onnxruntime include/onnxruntime/core/session)
find_library(OnnxRuntime_LIBRARY NAMES onnxruntime libonnxruntime.so.1 HINTS ${_ort_roots} PATH_SUFFIXES lib)
find_file(OnnxRuntime_LICENSE_FILE LICENSE HINTS ${_ort_roots} NO_DEFAULT_PATH)
mark_as_advanced(OnnxRuntime_INCLUDE_DIR OnnxRuntime_LIBRARY OnnxRuntime_LICENSE_FILE)

include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(OnnxRuntime
  REQUIRED_VARS OnnxRuntime_LIBRARY OnnxRuntime_INCLUDE_DIR
  REASON_FAILURE_MESSAGE "run './run deps', or give its root: -DONNXRUNTIME_ROOT=DIR")

if(OnnxRuntime_FOUND AND NOT TARGET OnnxRuntime::OnnxRuntime)
  add_library(OnnxRuntime::OnnxRuntime SHARED IMPORTED)
  set_target_properties(OnnxRuntime::OnnxRuntime PROPERTIES
    IMPORTED_LOCATION "${OnnxRuntime_LIBRARY}"
    INTERFACE_INCLUDE_DIRECTORIES "${OnnxRuntime_INCLUDE_DIR}")
endif()
