# What `make install` puts where, and how other projects find it: find_package(dirbase) with the targets dirbase::dirbase
# and dirbase::dirsibling, or pkg-config dirbase.
#
# Headers keep the layout of the tree below include/dirbase, the folder that both ways put on the include path, so that
# the same #include line works inside and outside.
include(CMakePackageConfigHelpers)

target_sources(dirsibling INTERFACE FILE_SET HEADERS BASE_DIRS ${PROJECT_SOURCE_DIR} FILES ${public_headers})
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/dirbase)

install(TARGETS dirsibling dirbase EXPORT dirbase
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/dirbase)
if(TARGET dirbase_tool)
    install(TARGETS dirbase_tool RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
    install(FILES tools/dirbase/dirbase.1 DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
endif()
install(DIRECTORY share/schema/ DESTINATION ${CMAKE_INSTALL_DATADIR}/dirbase/schema)
install(DIRECTORY share/sample/ DESTINATION ${CMAKE_INSTALL_DATADIR}/dirbase/sample FILES_MATCHING PATTERN "*.ldif")

install(EXPORT dirbase NAMESPACE dirbase:: FILE dirbaseTargets.cmake DESTINATION ${package_dir})
configure_package_config_file(cmake/dirbaseConfig.cmake.in ${PROJECT_BINARY_DIR}/dirbaseConfig.cmake
    INSTALL_DESTINATION ${package_dir} PATH_VARS CMAKE_INSTALL_DATADIR)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/dirbaseConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/dirbaseConfig.cmake ${PROJECT_BINARY_DIR}/dirbaseConfigVersion.cmake
    DESTINATION ${package_dir})

file(RELATIVE_PATH prefix_from_pcdir ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
configure_file(cmake/dirbase.pc.in ${PROJECT_BINARY_DIR}/dirbase.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/dirbase.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
