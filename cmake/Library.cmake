# What other programs link: a static and a shared library of the same objects, their headers, and
# how CMake and pkg-config find them. See docs/library.md.

# The sanitizers' own libraries are linked to programs only.
if(VELA_SANITIZE)
  return()
endif()

set(parts velathumb_library velaplatform velaconfiguration velaheader velaposix)
if(VELA_PLATFORM STREQUAL "standalone")
  list(APPEND parts velaindex)
  set(VELA_LIBRARY_NEEDS jsoncpp inih sqlite3 pthread ${CMAKE_DL_LIBS})
else()
  set(VELA_LIBRARY_NEEDS ${VELA_PLATFORM_LIBRARIES} jsoncpp pthread ${CMAKE_DL_LIBS})
endif()
foreach(part IN LISTS parts)
  list(APPEND objects $<TARGET_OBJECTS:${part}>)
endforeach()

add_library(velathumb_static STATIC ${objects})
target_link_libraries(velathumb_static INTERFACE ${VELA_LIBRARY_NEEDS})
set_target_properties(velathumb_static PROPERTIES EXPORT_NAME static)

# The version script names what is exported.
set(VELA_EXPORTS ${PROJECT_SOURCE_DIR}/src/velathumb.map)
add_library(velathumb_shared SHARED ${objects})
target_link_libraries(velathumb_shared PRIVATE ${VELA_LIBRARY_NEEDS})
target_link_options(velathumb_shared PRIVATE -Wl,--version-script=${VELA_EXPORTS}
                    -Wl,--no-undefined -Wl,-Bsymbolic-functions)
set_target_properties(velathumb_shared PROPERTIES EXPORT_NAME shared LINK_DEPENDS ${VELA_EXPORTS}
                      VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR})

foreach(library IN ITEMS velathumb_static velathumb_shared)
  set_target_properties(${library} PROPERTIES OUTPUT_NAME velathumb LINKER_LANGUAGE CXX)
  target_compile_features(${library} INTERFACE cxx_std_17)
  target_include_directories(
    ${library} INTERFACE $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}/velathumb>
                         $<INSTALL_INTERFACE:${JSONCPP_INCLUDE_DIR}>)
endforeach()

# The headers that declare the library's operations, and those that they include.
set(VELA_PUBLIC_HEADERS
    convert/convert_command.h convert/photo_convert_job.h convert/photo_thumb_setting.h
    convert/velamk_photo_thumb.h ipc/velamk_ipc.h platform/system_rules.h platform/velaindex.h
    platform/velautils.h platform/vlibc.h profiles/directory_job.h profiles/photo_thumb_plan.h
    profiles/thumbnail_profile.h progress/velamk_progress.h source/orientation.h
    source/raw_image.h source/rotation_check.h storage/file_helpers.h storage/thumb_size_class.h
    storage/velamk_thumb_status.h storage/velamk_util.h thumb/directory_pass.h
    thumb/directory_walk.h thumb/index_registration.h thumb/phase_status.h
    thumb/process_control.h thumb/velathumb.h)
foreach(header IN LISTS VELA_PUBLIC_HEADERS)
  get_filename_component(folder ${header} DIRECTORY)
  install(FILES ${PROJECT_SOURCE_DIR}/src/${header}
          DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/velathumb/${folder})
endforeach()

install(TARGETS velathumb_static velathumb_shared EXPORT velathumbTargets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})

include(CMakePackageConfigHelpers)
set(VELA_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/velathumb)
install(EXPORT velathumbTargets NAMESPACE velathumb:: DESTINATION ${VELA_CMAKE_DIR})
set(config ${PROJECT_BINARY_DIR}/velathumbConfig.cmake)
set(version ${PROJECT_BINARY_DIR}/velathumbConfigVersion.cmake)
file(WRITE ${config} "include(\${CMAKE_CURRENT_LIST_DIR}/velathumbTargets.cmake)\n")
write_basic_package_version_file(${version} COMPATIBILITY SameMinorVersion)
install(FILES ${config} ${version} DESTINATION ${VELA_CMAKE_DIR})

# pkg-config: velathumb for the shared library, velathumb-static for the other.
list(TRANSFORM VELA_LIBRARY_NEEDS PREPEND -l OUTPUT_VARIABLE VELA_LIBRARY_FLAGS)
list(JOIN VELA_LIBRARY_FLAGS " " VELA_LIBRARY_FLAGS)
# Relative, so that the files are right below any prefix.
file(RELATIVE_PATH VELA_PC_TO_PREFIX /${CMAKE_INSTALL_LIBDIR}/pkgconfig /)
string(REGEX REPLACE "/$" "" VELA_PC_TO_PREFIX "${VELA_PC_TO_PREFIX}")
foreach(package IN ITEMS velathumb velathumb-static)
  configure_file(${PROJECT_SOURCE_DIR}/cmake/${package}.pc.in ${PROJECT_BINARY_DIR}/${package}.pc
                 @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/${package}.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endforeach()
