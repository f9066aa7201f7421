# Installs the build tree BUILD into an empty prefix, builds the sample plug-in there as a project of its own, and has
# the installed quarn run its script; then the installed plug-in moves the example scene.
function(must_run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE status OUTPUT_VARIABLE output ERROR_VARIABLE errors)
  if(NOT status EQUAL 0)
    list(JOIN ARGN " " command)
    message(FATAL_ERROR "${command}\n${output}${errors}")
  endif()
  set(output "${output}" PARENT_SCOPE)
endfunction()

file(REMOVE_RECURSE "${WORK}")
must_run(${CMAKE_COMMAND} --install "${BUILD}" --prefix "${WORK}/prefix")
file(RENAME "${WORK}/prefix" "${WORK}/moved")
file(COPY "${EXAMPLE}/" DESTINATION "${WORK}/minimal")
must_run(${CMAKE_COMMAND} -S "${WORK}/minimal" -B "${WORK}/minimal/build" -G "${GENERATOR}"
  -D CMAKE_CXX_COMPILER=${COMPILER} -D CMAKE_PREFIX_PATH=${WORK}/moved -D CMAKE_BUILD_TYPE=Release)
must_run(${CMAKE_COMMAND} --build "${WORK}/minimal/build")
must_run("${EXPORTS}" "${WORK}/minimal/build/minimal.so")
must_run("${WORK}/moved/bin/quarn" exec --plugin "${WORK}/minimal/build/minimal.so" "${WORK}/minimal/demo.txt")
file(READ "${EXAMPLE}/expected.txt" expected)
if(NOT output STREQUAL expected)
  message(FATAL_ERROR "the script of the sample plug-in printed:\n${output}")
endif()

must_run(${CMAKE_COMMAND} -E chdir "${SOURCE}" "${WORK}/moved/bin/quarn" exec
  --plugin "${WORK}/moved/lib/OpenQuarn/plug-ins/neuralWarp.so" examples/wave/evaluate.txt)
file(READ "${SOURCE}/examples/wave/expected.txt" expected)
if(NOT output STREQUAL expected)
  message(FATAL_ERROR "the example scene printed:\n${output}")
endif()
