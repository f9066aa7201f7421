# Run by CPack on the tree that it is about to pack: what only one kind of package has.
if(CPACK_GENERATOR STREQUAL "DEB")
  # the programs on everybody's PATH
  file(MAKE_DIRECTORY "${CPACK_TEMPORARY_DIRECTORY}/usr/bin")
  foreach(program quarn neuralwarp-train neuralwarp-farm)
    file(CREATE_LINK "../..${CPACK_PACKAGING_INSTALL_PREFIX}/bin/${program}"
      "${CPACK_TEMPORARY_DIRECTORY}/usr/bin/${program}" SYMBOLIC)
  endforeach()
else()
  file(COPY_FILE "${CPACK_RESOURCE_FILE_README}" "${CPACK_TEMPORARY_DIRECTORY}/README.md")
endif()
