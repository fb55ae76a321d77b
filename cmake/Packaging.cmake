# The Debian package: cpack -G DEB in the build directory.
set(CPACK_PACKAGE_NAME velathumb)
set(CPACK_PACKAGE_CONTACT "velathumb maintainers <root@localhost>" CACHE STRING
    "Name and address of the package maintainer")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_DESCRIPTION
    "velathumb makes the missing preview thumbnails of the photos in a directory or a tree, in up to
six sizes, and stores them in a metadata directory next to the photos.")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_VERBATIM_VARIABLES ON)

# Library dependencies are derived from the programs; the tools come from scripts/dependencies.
execute_process(
  COMMAND ${PROJECT_SOURCE_DIR}/scripts/dependencies run
  OUTPUT_VARIABLE VELA_RUN_PACKAGES
  OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
string(REPLACE "\n" ", " CPACK_DEBIAN_PACKAGE_DEPENDS "${VELA_RUN_PACKAGES}")
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# Loaded at run time to check videos, so the dependency cannot be derived from the programs.
if(VELA_PLATFORM STREQUAL "standalone")
  execute_process(
    COMMAND ${PKG_CONFIG_EXECUTABLE} --modversion libavformat
    OUTPUT_VARIABLE VELA_AVFORMAT_VERSION
    OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
  string(REGEX MATCH "^[0-9]+" VELA_AVFORMAT_MAJOR "${VELA_AVFORMAT_VERSION}")
  string(APPEND CPACK_DEBIAN_PACKAGE_DEPENDS ", libavformat${VELA_AVFORMAT_MAJOR}")
endif()
set(CPACK_DEBIAN_PACKAGE_SECTION graphics)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)

# Installs the tools where velathumb expects them. Only the package does this: an installation with
# another prefix must not write to /usr/vela.
set(CPACK_PRE_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/cmake/PackageTools.cmake)

install(FILES ${PROJECT_SOURCE_DIR}/README.md DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/docs/ DESTINATION ${CMAKE_INSTALL_DOCDIR}/docs
        FILES_MATCHING PATTERN "*.md")
install(FILES ${PROJECT_SOURCE_DIR}/LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR} RENAME copyright)

include(CPack)
