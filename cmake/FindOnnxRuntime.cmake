# Finds ONNX Runtime and defines OnnxRuntime::OnnxRuntime. In this order:
#   1. a CMake package named onnxruntime (CMAKE_PREFIX_PATH),
#   2. ONNXRUNTIME_ROOT, a CMake or environment variable: a folder with include/ and lib/,
#   3. build/deps/onnxruntime, which `./run deps` fills.
# Also sets OnnxRuntime_LICENSE_FILE when the root holds one; it is installed along with the library.

# The code asks for function table 16, which came with 1.16.
if(NOT OnnxRuntime_FIND_VERSION)
  set(OnnxRuntime_FIND_VERSION 1.16)
endif()

find_package(onnxruntime ${OnnxRuntime_FIND_VERSION} CONFIG QUIET)
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

# The version of the function table that these headers declare, which is the minor version of the release.
if(OnnxRuntime_INCLUDE_DIR AND EXISTS "${OnnxRuntime_INCLUDE_DIR}/onnxruntime_c_api.h")
  file(STRINGS "${OnnxRuntime_INCLUDE_DIR}/onnxruntime_c_api.h" _ort_api REGEX "#define ORT_API_VERSION")
  string(REGEX MATCH "[0-9]+" _ort_api "${_ort_api}")
  set(OnnxRuntime_VERSION "1.${_ort_api}")
endif()

include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(OnnxRuntime
  REQUIRED_VARS OnnxRuntime_LIBRARY OnnxRuntime_INCLUDE_DIR
  VERSION_VAR OnnxRuntime_VERSION
  REASON_FAILURE_MESSAGE "run './run deps', or give its root: -DONNXRUNTIME_ROOT=DIR")

if(OnnxRuntime_FOUND AND NOT TARGET OnnxRuntime::OnnxRuntime)
  add_library(OnnxRuntime::OnnxRuntime SHARED IMPORTED)
  set_target_properties(OnnxRuntime::OnnxRuntime PROPERTIES
    IMPORTED_LOCATION "${OnnxRuntime_LIBRARY}"
    INTERFACE_INCLUDE_DIRECTORIES "${OnnxRuntime_INCLUDE_DIR}")
endif()
