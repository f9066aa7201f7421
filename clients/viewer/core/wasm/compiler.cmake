# nw_wasm(<target> <output> SOURCES <files> SMALL <files> FOLDERS <include folders>): a WebAssembly module that imports
# nothing. SMALL: those that no frame waits for.
# NW_WASM_COMPILER is empty where there is no compiler for it, with its C++ library.

find_program(NW_WASM_COMPILER NAMES clang++-14 DOC "clang 14 with its WebAssembly target")
mark_as_advanced(NW_WASM_COMPILER)
if(NW_WASM_COMPILER AND NOT NW_WASM_COMPILER STREQUAL NW_WASM_WORKS)
  set(_trial "${CMAKE_CURRENT_BINARY_DIR}/trial")
  file(WRITE "${_trial}.cpp" "#include <vector>\nint main() { return static_cast<int>(std::vector<int>(3).size()); }\n")
  execute_process(COMMAND "${NW_WASM_COMPILER}" --target=wasm32-wasi -fno-exceptions "${_trial}.cpp" -o "${_trial}.wasm"
    RESULT_VARIABLE _failed OUTPUT_QUIET ERROR_QUIET)
  if(_failed)
    set(NW_WASM_COMPILER "")
  else()
    set(NW_WASM_WORKS "${NW_WASM_COMPILER}" CACHE INTERNAL "The compiler that has been tried")
  endif()
endif()

# The side-by-side vectoriser makes the scalar smoothing 2.6 times slower. No product is fused with a sum, as elsewhere.
set(NW_WASM_FLAGS --target=wasm32-wasi -std=c++20 -DNDEBUG -msimd128 -mbulk-memory -fno-slp-vectorize -ffp-contract=off
  -fno-math-errno -fvisibility=hidden -Wall -Wextra -Wpedantic -Wshadow
  $<$<BOOL:${NW_WARNINGS_AS_ERRORS}>:-Werror>)

function(nw_wasm target output)
  cmake_parse_arguments(ARG "" "" "SOURCES;SMALL;FOLDERS" ${ARGN})
  cmake_path(NORMAL_PATH output)
  list(TRANSFORM ARG_FOLDERS PREPEND -I OUTPUT_VARIABLE includes)
  set(objects)
  foreach(source IN LISTS ARG_SOURCES ARG_SMALL)
    file(RELATIVE_PATH name "${PROJECT_SOURCE_DIR}" "${source}")
    string(REPLACE "/" "." name "${name}")
    set(level -O3)
    if(source IN_LIST ARG_SMALL)
      set(level -Os)
    endif()
    set(object "${CMAKE_CURRENT_BINARY_DIR}/${target}/${name}.o")
    add_custom_command(OUTPUT "${object}"
      COMMAND "$<$<BOOL:${NW_CCACHE}>:${NW_CCACHE}>" "${NW_WASM_COMPILER}" ${NW_WASM_FLAGS} ${level} ${includes} -MD -MF "${object}.d" -c "${source}"
        -o "${object}"
      DEPENDS "${source}" DEPFILE "${object}.d" COMMENT "Building ${name} for WebAssembly"
      COMMAND_EXPAND_LISTS VERBATIM)
    list(APPEND objects "${object}")
  endforeach()
  file(MAKE_DIRECTORY "${CMAKE_CURRENT_BINARY_DIR}/${target}")
  # without -O, for which clang would call binaryen
  add_custom_command(OUTPUT "${output}"
    COMMAND "${NW_WASM_COMPILER}" --target=wasm32-wasi -mexec-model=reactor -Wl,--strip-all -Wl,-z,stack-size=1048576
      ${objects} -o "${output}"
    DEPENDS ${objects} COMMENT "Linking ${target}" VERBATIM)
  add_custom_target(${target} ALL DEPENDS "${output}")
endfunction()
