# nw_own_tbb(<variable>): the folder of a oneTBB of our own, for the thread sanitizer, of which CMake takes no notice when
# it takes over where other packages' libraries lie: it is below the source tree. Empty elsewhere.
function(nw_own_tbb result)
  set(folder "")
  cmake_path(IS_PREFIX PROJECT_SOURCE_DIR "${TBB_DIR}" is_ours)
  if(is_ours)
    cmake_path(GET TBB_DIR PARENT_PATH folder) # lib/cmake/TBB
    cmake_path(GET folder PARENT_PATH folder)
  endif()
  set(${result} "${folder}" PARENT_SCOPE)
endfunction()

# nw_link_runpath(<target>): for one that finds nothing in the build tree: the same RUNPATH there and where it is
# installed, the folders of other packages' libraries.
function(nw_link_runpath target)
  nw_own_tbb(tbb)
  set_target_properties(${target} PROPERTIES
    BUILD_WITH_INSTALL_RPATH ON INSTALL_RPATH "${tbb}" INSTALL_RPATH_USE_LINK_PATH ON)
endfunction()

# nw_runpath(<target> <destination> <installed>...): where a target that is installed in <destination> looks for its
# libraries: in the build tree where they were built or found, in the installed tree in <installed>, and in both also
# where libraries of other packages lie. Call it behind install(TARGETS).
#
# CMake itself ends the RUNPATH of what it will change at installation with ':', and an empty element is the current
# folder: whoever starts the program in a folder with a libtbb.so.12 of its own runs that one (decision 0126). So it is
# linked as if nothing were to change, and changed here. The text is overwritten where it lies, so both have the same
# length; it ends with '/.', because the linker lets a symbol use the end of a text that ends with its name.
function(nw_runpath target destination)
  list(JOIN ARGN ":" installed)
  get_target_property(host OpenQuarn BINARY_DIR)
  set(built "${host}/.")
  if(OnnxRuntime_LIBRARY)
    cmake_path(GET OnnxRuntime_LIBRARY PARENT_PATH runtime)
    set(built "${runtime}:${built}")
  endif()
  nw_own_tbb(tbb)
  if(tbb)
    set(built "${tbb}:${built}")
  endif()

  string(LENGTH "${installed}" needed)
  string(LENGTH "${built}" length)
  while(length LESS needed)
    string(APPEND built "/.")
    math(EXPR length "${length} + 2")
  endwhile()
  math(EXPR rest "${length} - ${needed}")
  string(REPEAT "/" ${rest} padding)
  string(APPEND installed "${padding}")

  string(REPLACE ":" ";" elements "${built}")
  set_target_properties(${target} PROPERTIES
    BUILD_WITH_INSTALL_RPATH ON INSTALL_RPATH "${elements}" INSTALL_RPATH_USE_LINK_PATH ON)
  string(REPLACE "$" "\\$" installed "${installed}")
  install(CODE "file(RPATH_CHANGE
    FILE \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/${destination}/$<TARGET_FILE_NAME:${target}>\"
    OLD_RPATH \"${built}\" NEW_RPATH \"${installed}\")")
endfunction()
