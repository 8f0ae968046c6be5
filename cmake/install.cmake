# What `cmake --install` puts under the prefix: the shared library with its
# soname and dev link, optionally the static library, the public headers, the
# metainfo program, a pkg-config file and a CMake package (metainfo::metainfo).
include(CMakePackageConfigHelpers)

set(METAINFO_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/metainfo)
set(METAINFO_INSTALL_TARGETS metainfo)

if(METAINFO_INSTALL_STATIC)
  # The same objects as libmetainfo.so, as libmetainfo.a (metainfo::metainfo_static).
  add_library(metainfo_archive STATIC $<TARGET_OBJECTS:metainfo_objects>)
  set_target_properties(metainfo_archive PROPERTIES OUTPUT_NAME metainfo EXPORT_NAME metainfo_static)
  target_include_directories(metainfo_archive PUBLIC
    $<BUILD_INTERFACE:${CMAKE_CURRENT_SOURCE_DIR}/include>
    $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>)
  target_link_libraries(metainfo_archive PUBLIC Threads::Threads)
  list(APPEND METAINFO_INSTALL_TARGETS metainfo_archive)
endif()

install(TARGETS ${METAINFO_INSTALL_TARGETS} EXPORT metainfoTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(TARGETS metainfo_cli RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
install(DIRECTORY include/metainfo DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN "*.h" PATTERN "*.hpp")

install(EXPORT metainfoTargets NAMESPACE metainfo:: DESTINATION ${METAINFO_CMAKE_DIR})
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/metainfoConfig.cmake.in
  ${CMAKE_CURRENT_BINARY_DIR}/metainfoConfig.cmake INSTALL_DESTINATION ${METAINFO_CMAKE_DIR})
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/metainfoConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/metainfoConfig.cmake ${CMAKE_CURRENT_BINARY_DIR}/metainfoConfigVersion.cmake
  DESTINATION ${METAINFO_CMAKE_DIR})

# The .pc file finds the prefix from where it lies, so a tree installed with
# --prefix anywhere (or moved) still answers right.
file(RELATIVE_PATH METAINFO_PC_TO_PREFIX /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
string(REGEX REPLACE "/$" "" METAINFO_PC_TO_PREFIX "${METAINFO_PC_TO_PREFIX}")
configure_file(${CMAKE_CURRENT_LIST_DIR}/metainfo.pc.in ${CMAKE_CURRENT_BINARY_DIR}/metainfo.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/metainfo.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

install(FILES docs/metainfo.1 DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
