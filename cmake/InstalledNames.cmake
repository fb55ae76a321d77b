# Writes platform/installed_names.h. Sets VELA_IMAGEMAGICK_VERSION unless the caller has, and
# VELA_IMAGEMAGICK_PROGRAM.

# The major version of ImageMagick: that of the installed one; if there is none, Debian's.
function(vela_find_imagemagick_version)
  foreach(version IN ITEMS 7 6)
    if(EXISTS /usr/bin/convert-im${version}.q16)
      set(VELA_IMAGEMAGICK_VERSION ${version} PARENT_SCOPE)
      return()
    endif()
  endforeach()
  cmake_host_system_information(RESULT release QUERY DISTRIB_VERSION_ID)
  if(release AND release LESS_EQUAL 12)
    set(VELA_IMAGEMAGICK_VERSION 6 PARENT_SCOPE)
  else()
    set(VELA_IMAGEMAGICK_VERSION 7 PARENT_SCOPE)
  endif()
endfunction()

# Sets VELA_LIBRARY_<name> to the name under which programs that are linked to the library load it.
function(vela_find_library_name name)
  find_library(VELA_FILE_OF_${name} NAMES ${name} REQUIRED)
  mark_as_advanced(VELA_FILE_OF_${name})
  execute_process(COMMAND ${CMAKE_OBJDUMP} -p ${VELA_FILE_OF_${name}} OUTPUT_VARIABLE headers
                  COMMAND_ERROR_IS_FATAL ANY)
  if(NOT headers MATCHES "SONAME +([^ \n]+)")
    message(FATAL_ERROR "${VELA_FILE_OF_${name}} is not a shared library")
  endif()
  set(VELA_LIBRARY_${name} ${CMAKE_MATCH_1} PARENT_SCOPE)
endfunction()

if(NOT VELA_IMAGEMAGICK_VERSION)
  vela_find_imagemagick_version()
endif()
set(VELA_IMAGEMAGICK_PROGRAM /usr/bin/convert-im${VELA_IMAGEMAGICK_VERSION}.q16)
set(VELA_IMAGEMAGICK_CONFIGURATION /etc/ImageMagick-${VELA_IMAGEMAGICK_VERSION})
set(VELA_IMAGEMAGICK_SHARED /usr/share/ImageMagick-${VELA_IMAGEMAGICK_VERSION})
foreach(name IN ITEMS gif netpbm turbojpeg vips)
  vela_find_library_name(${name})
endforeach()
if(VELA_PLATFORM STREQUAL "standalone")
  vela_find_library_name(avformat)
endif()
configure_file(${PROJECT_SOURCE_DIR}/src/platform/installed_names.h.in
               ${PROJECT_BINARY_DIR}/generated/platform/installed_names.h @ONLY)
include_directories(${PROJECT_BINARY_DIR}/generated)
