# Installs the build tree BUILD into an empty prefix, then configures, builds and runs CONSUMER against it.
function(must_run)
  execute_process(COMMAND ${ARGN} RESULT_VARIABLE status OUTPUT_VARIABLE output ERROR_VARIABLE output)
  if(NOT status EQUAL 0)
    list(JOIN ARGN " " command)
    message(FATAL_ERROR "${command}\n${output}")
  endif()
endfunction()

file(REMOVE_RECURSE "${WORK}")
must_run(${CMAKE_COMMAND} --install "${BUILD}" --prefix "${WORK}/prefix")
if(NOT EXISTS "${WORK}/prefix/share/doc/neuralWarp/LICENSE")
  message(FATAL_ERROR "the licence is not installed")
endif()
file(GLOB installed RELATIVE "${WORK}/prefix/share/OpenQuarn/GPUBuiltInDeformer/kernels"
  "${WORK}/prefix/share/OpenQuarn/GPUBuiltInDeformer/kernels/*")
file(GLOB kernels RELATIVE "${CMAKE_CURRENT_LIST_DIR}/../../plugin/kernels" "${CMAKE_CURRENT_LIST_DIR}/../../plugin/kernels/*.cl*")
if(NOT installed STREQUAL kernels)
  message(FATAL_ERROR "kernels installed: ${installed}\nsources of kernels: ${kernels}")
endif()

# moved after the installation: a package that remembers where it was installed does not survive that
file(RENAME "${WORK}/prefix" "${WORK}/moved")
must_run(${CMAKE_COMMAND} -S "${CONSUMER}" -B "${WORK}/build" -G "${GENERATOR}"
  -D CMAKE_CXX_COMPILER=${COMPILER} -D CMAKE_PREFIX_PATH=${WORK}/moved -D CMAKE_BUILD_TYPE=Release)
must_run(${CMAKE_COMMAND} --build "${WORK}/build")
must_run("${WORK}/build/consumer")
must_run("${CMAKE_CURRENT_LIST_DIR}/runpaths.sh" "${WORK}/moved")
file(WRITE "${WORK}/nothing.txt" "")
must_run("${WORK}/moved/bin/quarn" exec --plugin "${WORK}/build/gpuPlugin.so" "${WORK}/nothing.txt")

# the flag that keeps results the same on every machine travels with the package
file(READ "${WORK}/build/compile_commands.json" commands)
if(NOT commands MATCHES "-ffp-contract=off")
  message(FATAL_ERROR "the consumer was compiled without -ffp-contract=off:\n${commands}")
endif()
