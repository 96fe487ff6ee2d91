# What `cmake --install` lays out and cpack packs: one include root of our own, both libraries, a
# package for find_package, one for pkg-config, and the examples as sources.
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

set(include_root ${CMAKE_INSTALL_INCLUDEDIR}/kelm-tin)
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/kelm-tin)
set(here ${CMAKE_CURRENT_LIST_DIR})

target_include_directories(kelm_headers INTERFACE $<INSTALL_INTERFACE:${include_root}>)
# The libraries find each other beside themselves, under whatever prefix.
set_target_properties(kelm_tin kelm_services PROPERTIES INSTALL_RPATH "$ORIGIN")
set_target_properties(kelm_headers PROPERTIES EXPORT_NAME headers)
set_target_properties(kelm_services PROPERTIES EXPORT_NAME services)
set_target_properties(kelm_tin PROPERTIES EXPORT_NAME tin)

install(TARGETS kelm_headers kelm_services kelm_tin EXPORT kelm-tin
        LIBRARY COMPONENT runtime NAMELINK_COMPONENT development
        ARCHIVE COMPONENT development)

# The folders within are rooms of the implementation, but for tin/detail: its polygons are what the
# public triangulation takes.
foreach(public IN ITEMS tin tin/detail containers services)
  file(GLOB headers CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/${public}/*.h)
  install(FILES ${headers} DESTINATION ${include_root}/${public} COMPONENT development)
endforeach()

install(DIRECTORY examples DESTINATION ${CMAKE_INSTALL_DATADIR}/kelm-tin COMPONENT development
        FILES_MATCHING PATTERN "*.h" PATTERN "*.cpp" PATTERN "*.py" PATTERN CMakeLists.txt)

install(EXPORT kelm-tin NAMESPACE kelm:: FILE kelm-tin-targets.cmake DESTINATION ${package_dir}
        COMPONENT development)
configure_package_config_file(${here}/kelm-tin-config.cmake.in kelm-tin-config.cmake
                              INSTALL_DESTINATION ${package_dir}
                              NO_SET_AND_CHECK_MACRO)
# Until 1.0 a minor version may break what was built for the one before, and the soname tells; a
# program's source seldom.
write_basic_package_version_file(kelm-tin-config-version.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/kelm-tin-config.cmake
              ${PROJECT_BINARY_DIR}/kelm-tin-config-version.cmake
        DESTINATION ${package_dir} COMPONENT development)

# Relative to where the file lies, so that an installed tree can be moved.
set(pkgconfig_dir ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig)
file(RELATIVE_PATH pc_prefix ${pkgconfig_dir} ${CMAKE_INSTALL_PREFIX})
string(REGEX REPLACE "/$" "" pc_prefix "${pc_prefix}")
cmake_path(APPEND pc_includedir "\${prefix}" ${CMAKE_INSTALL_INCLUDEDIR})
cmake_path(APPEND pc_libdir "\${prefix}" ${CMAKE_INSTALL_LIBDIR})
# Whoever links static libraries links what they need; the shared ones bring it along.
set(pc_requires "")
set(pc_libs "")
if(NOT BUILD_SHARED_LIBS)
  set(pc_requires "gdal proj expat geos")
  set(pc_libs "-lstdc++ ${OpenMP_CXX_FLAGS}")
endif()
configure_file(${here}/kelm-tin.pc.in kelm-tin.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/kelm-tin.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig
        COMPONENT development)
