# What is installed besides the programs and the library. See also cmake/InstallForPrefix.cmake.

# Installs a symbolic link; its target need not exist yet.
function(vela_install_link path target)
  get_filename_component(folder ${path} DIRECTORY)
  get_filename_component(name ${path} NAME)
  set(link ${PROJECT_BINARY_DIR}/links/${folder}/${name})
  file(MAKE_DIRECTORY ${PROJECT_BINARY_DIR}/links/${folder})
  file(CREATE_LINK ${target} ${link} SYMBOLIC)
  install(FILES ${link} DESTINATION ${folder})
endfunction()

# The link has the converter's name, so that the process keeps it when ImageMagick takes over.
vela_install_link(${VELA_TOOLS_DIR}/lib/convert-thumb ${VELA_IMAGEMAGICK_PROGRAM})
vela_install_link(${VELA_TOOLS_DIR}/bin/exiftool /usr/bin/exiftool)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/config/imagemagick DESTINATION ${VELA_TOOLS_DIR}/share)

# Manual pages by section, of the programs that are installed.
foreach(section IN ITEMS 1 5 8)
  file(GLOB pages CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/docs/*.${section})
  if(NOT VELA_CONVERTER STREQUAL "own")
    list(FILTER pages EXCLUDE REGEX "/convert-thumb\\.1$")
  endif()
  install(FILES ${pages} DESTINATION ${CMAKE_INSTALL_MANDIR}/man${section})
endforeach()

file(GLOB completions CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/programs/*/*.bash)
foreach(completion IN LISTS completions)
  get_filename_component(program ${completion} NAME_WE)
  install(FILES ${completion} RENAME ${program}
          DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
endforeach()

install(FILES ${PROJECT_SOURCE_DIR}/README.md ${PROJECT_SOURCE_DIR}/LICENSE
        DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/docs/ DESTINATION ${CMAKE_INSTALL_DOCDIR}/docs
        FILES_MATCHING PATTERN "*.md")

# The profile that the service reads, and the units: they contain paths.
configure_file(${CMAKE_CURRENT_LIST_DIR}/InstallForPrefix.cmake.in
               ${PROJECT_BINARY_DIR}/InstallForPrefix.cmake @ONLY)
install(SCRIPT ${PROJECT_BINARY_DIR}/InstallForPrefix.cmake)
