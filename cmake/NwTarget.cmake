# What every target of this project is built with. Usage: nw_target(<target>)

find_program(NW_CCACHE ccache)
mark_as_advanced(NW_CCACHE)
if(NW_CCACHE AND NOT DEFINED CMAKE_CXX_COMPILER_LAUNCHER)
  set(CMAKE_CXX_COMPILER_LAUNCHER "${NW_CCACHE}")
endif()

# Results are bit-identical across instruction sets, so no product may be fused with a sum behind our back.
# GCC 12 forgets the rounding when it turns pairs of doubles to float and back side by side (decision 0004).
set(NW_NUMERIC_FLAGS -ffp-contract=off $<$<CXX_COMPILER_ID:GNU>:-fno-tree-slp-vectorize>)

set(NW_WARNINGS -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wold-style-cast -Wnon-virtual-dtor
  # RapidJSON's iterators compare in a way that C++20 finds ambiguous, and every loop over an object's members says so.
  $<$<CXX_COMPILER_ID:Clang>:-Wno-ambiguous-reversed-operator>
  # GCC 12 takes "text" + std::to_string(n) for an overlapping copy when it is inlined (its bug 105329).
  $<$<CXX_COMPILER_ID:GNU>:-Wno-restrict>)

function(nw_target target)
  set_target_properties(${target} PROPERTIES
    CXX_STANDARD 20
    CXX_STANDARD_REQUIRED ON
    CXX_EXTENSIONS OFF
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    POSITION_INDEPENDENT_CODE ON)
  target_compile_options(${target} PRIVATE
    ${NW_NUMERIC_FLAGS} ${NW_WARNINGS} $<$<BOOL:${NW_WARNINGS_AS_ERRORS}>:-Werror>)
  # the fuzzer only steers by code that counts its edges, and that is the libraries' above all
  if(NW_BUILD_FUZZ)
    target_compile_options(${target} PRIVATE -fsanitize=fuzzer-no-link)
    target_link_options(${target} PRIVATE -fsanitize=fuzzer-no-link)
  endif()
  if(NW_SANITIZE)
    target_compile_options(${target} PRIVATE
      -fsanitize=${NW_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
    target_link_options(${target} PRIVATE -fsanitize=${NW_SANITIZE})
    if(NW_SANITIZE MATCHES undefined AND CMAKE_CXX_COMPILER_ID MATCHES Clang)
      # by a path that is the same in every checkout, and by the option's older name, of which ccache knows that it names
      # a file: otherwise no checkout could use what another one has compiled
      file(RELATIVE_PATH _ignorelist ${CMAKE_BINARY_DIR} ${PROJECT_SOURCE_DIR}/tests/sanitizers/ubsan.ignorelist)
      target_compile_options(${target} PRIVATE -fsanitize-blacklist=${_ignorelist})
    endif()
  endif()
endfunction()
