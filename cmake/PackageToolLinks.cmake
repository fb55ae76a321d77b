# Run by cpack when the files of the package are in place and before they are packed.
set(TOOLS ${CPACK_TEMPORARY_DIRECTORY}${CPACK_PACKAGING_INSTALL_PREFIX}/vela/bin)
file(MAKE_DIRECTORY ${TOOLS})
file(CREATE_LINK /usr/bin/convert ${TOOLS}/convert-thumb SYMBOLIC)
file(CREATE_LINK /usr/bin/exiftool ${TOOLS}/exiftool SYMBOLIC)
