# What `make install` puts where, and how other projects find it: find_package(dirbase) with the targets
# dirbase::dirbase and dirbase::dirsibling, or pkg-config dirbase.
#
# No path of the building machine goes into an installed file, and everything finds the rest from where it stands: the
# installation can be moved whole. tests/install holds it to that.
include(CMakePackageConfigHelpers)

# Headers keep the layout of the tree below include/dirbase, the folder that both ways put on the include path, so that
# the same #include line works inside and outside. Those that callers name are installed, with what these include; the
# others are the library's own business.
set(offered_headers
    servers/vrnd/libdirbase/dirbase.h
    servers/vrnd/libdirbase/schema/ldcf_schema_recover.h)
file(GLOB sibling_headers CONFIGURE_DEPENDS libraries/libber/*.h libraries/libmsg/*.h libraries/libpwd/*.h
    libraries/libtrace/*.h libraries/libvrnutil/*.h)
foreach(header IN LISTS sibling_headers)
    file(STRINGS ${header} exports REGEX "DIRBASE_EXPORT ")
    if(exports)
        file(RELATIVE_PATH header ${PROJECT_SOURCE_DIR} ${header})
        list(APPEND offered_headers ${header})
    endif()
endforeach()

set(installed_headers "")
while(offered_headers)
    list(POP_FRONT offered_headers header)
    if(NOT header IN_LIST installed_headers)
        list(APPEND installed_headers ${header})
        file(STRINGS ${PROJECT_SOURCE_DIR}/${header} includes REGEX "^#include \"")
        list(TRANSFORM includes REPLACE "^#include \"([^\"]*)\".*" "\\1")
        list(APPEND offered_headers ${includes})
    endif()
endwhile()
list(SORT installed_headers)
list(JOIN installed_headers "\n" lines)
file(WRITE ${PROJECT_BINARY_DIR}/installed_headers.txt "${lines}\n")

list(TRANSFORM installed_headers PREPEND ${PROJECT_SOURCE_DIR}/)
target_sources(dirsibling INTERFACE FILE_SET HEADERS BASE_DIRS ${PROJECT_SOURCE_DIR} FILES ${installed_headers})
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/dirbase)

install(TARGETS dirsibling dirbase EXPORT dirbase
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/dirbase)
if(TARGET dirbase_tool)
    install(TARGETS dirbase_tool RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
    configure_file(tools/dirbase/dirbase.1 ${PROJECT_BINARY_DIR}/dirbase.1 @ONLY)
    install(FILES ${PROJECT_BINARY_DIR}/dirbase.1 DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
    install(FILES tools/dirbase/dirbase.bash-completion RENAME dirbase
        DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions)
endif()
install(DIRECTORY share/schema/ DESTINATION ${CMAKE_INSTALL_DATADIR}/dirbase/schema)
install(DIRECTORY share/sample/ DESTINATION ${CMAKE_INSTALL_DATADIR}/dirbase/sample FILES_MATCHING PATTERN "*.ldif")

install(EXPORT dirbase NAMESPACE dirbase:: FILE dirbaseTargets.cmake DESTINATION ${package_dir})
configure_package_config_file(cmake/dirbaseConfig.cmake.in ${PROJECT_BINARY_DIR}/dirbaseConfig.cmake
    INSTALL_DESTINATION ${package_dir} PATH_VARS CMAKE_INSTALL_DATADIR)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/dirbaseConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/dirbaseConfig.cmake ${PROJECT_BINARY_DIR}/dirbaseConfigVersion.cmake
    DESTINATION ${package_dir})

# The paths of the pkg-config file, all from the folder in which it stands.
foreach(folder LIBDIR INCLUDEDIR DATADIR)
    file(RELATIVE_PATH ${folder}_from_prefix ${CMAKE_INSTALL_PREFIX} ${CMAKE_INSTALL_FULL_${folder}})
endforeach()
file(RELATIVE_PATH prefix_from_pcdir ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
string(REGEX REPLACE "/$" "" prefix_from_pcdir ${prefix_from_pcdir})
configure_file(cmake/dirbase.pc.in ${PROJECT_BINARY_DIR}/dirbase.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/dirbase.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
