# openquarn_plugin(<target>): makes a MODULE library a plug-in of OpenQuarn. It is named after its target, exports the
# three symbols that the host looks for and no other, and can really be unloaded: a symbol that the loader has to keep
# unique in the process would pin the library for good.
set(_openquarn_plugin_exports "${CMAKE_CURRENT_LIST_DIR}/openquarn_plugin.map")

function(openquarn_plugin target)
  get_target_property(type ${target} TYPE)
  if(NOT type STREQUAL "MODULE_LIBRARY")
    message(FATAL_ERROR "openquarn_plugin: ${target} is a ${type}; make it with add_library(${target} MODULE ...)")
  endif()
  set_target_properties(${target} PROPERTIES
    PREFIX ""
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    LINK_DEPENDS "${_openquarn_plugin_exports}")
  target_compile_options(${target} PRIVATE $<$<CXX_COMPILER_ID:GNU>:-fno-gnu-unique>)
  target_link_options(${target} PRIVATE "LINKER:--version-script=${_openquarn_plugin_exports}")
  target_link_libraries(${target} PRIVATE OpenQuarn::OpenQuarn $<TARGET_NAME_IF_EXISTS:openquarn_helpers>)
endfunction()
