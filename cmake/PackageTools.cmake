# Run by cpack after the files of the package have been installed and before they are packed.
set(VELA ${CPACK_TEMPORARY_DIRECTORY}${CPACK_PACKAGING_INSTALL_PREFIX}/vela)
file(MAKE_DIRECTORY ${VELA}/bin ${VELA}/lib)
if(NOT EXISTS ${VELA}/bin/convert-thumb)
  file(COPY_FILE ${CMAKE_CURRENT_LIST_DIR}/../programs/convert-thumb/convert-thumb.sh
       ${VELA}/bin/convert-thumb)
endif()
file(CREATE_LINK /usr/bin/convert-im6.q16 ${VELA}/lib/convert-thumb SYMBOLIC)
file(CREATE_LINK /usr/bin/exiftool ${VELA}/bin/exiftool SYMBOLIC)
