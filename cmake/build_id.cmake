# Writes BUILD_ID_FILE, the one source that knows which commit SOURCE_DIR is at; it is left alone when that is the same.
# A tree that was changed, in what the programs are made of, has a "+" behind it. Run at each build: cmake -P.
set(_commit "unknown")
find_program(_git git)

# answers what git prints of the tree; empty where there is no history, and where it is that of a folder above
function(ask_git result)
  set(${result} "" PARENT_SCOPE)
  if(NOT _git)
    return()
  endif()
  # without a lock, as somebody may be committing; and of a clone that belongs to another user, as in a container
  execute_process(COMMAND "${_git}" --no-optional-locks -c "safe.directory=${SOURCE_DIR}" ${ARGN}
    WORKING_DIRECTORY "${SOURCE_DIR}" OUTPUT_VARIABLE _answer ERROR_QUIET OUTPUT_STRIP_TRAILING_WHITESPACE
    RESULT_VARIABLE _status)
  if(_status EQUAL 0)
    set(${result} "${_answer}" PARENT_SCOPE)
  endif()
endfunction()

if(EXISTS "${SOURCE_DIR}/.git")
  ask_git(_hash rev-parse HEAD)
  ask_git(_changes status --porcelain -- CMakeLists.txt VERSION cmake libraries host plugin quarn clients/viewer)
else()
  file(STRINGS "${SOURCE_DIR}/cmake/commit.txt" _hash LIMIT_COUNT 1) # filled in by git archive
  set(_changes "")
endif()
if(_hash MATCHES "^[0-9a-f]+$")
  string(SUBSTRING "${_hash}" 0 12 _commit)
  if(_changes)
    string(APPEND _commit "+")
  endif()
endif()

set(_text "// written by cmake/build_id.cmake
#include \"quarn/console/build.h\"

namespace quarn {
const char* const commit = \"${_commit}\";
} // namespace quarn
")
set(_written "")
if(EXISTS "${BUILD_ID_FILE}")
  file(READ "${BUILD_ID_FILE}" _written)
endif()
if(NOT _written STREQUAL _text)
  file(WRITE "${BUILD_ID_FILE}" "${_text}")
endif()
