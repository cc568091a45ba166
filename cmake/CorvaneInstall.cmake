# Installs the library with its public headers, the CMake package and the pkg-config file.
include(CMakePackageConfigHelpers)

install(TARGETS corvane EXPORT corvaneTargets
    RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
    FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
    FILE_SET generated DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})

if(CORVANE_BUILD_AGENT)
    install(TARGETS corvane-transferd RUNTIME DESTINATION ${CMAKE_INSTALL_LIBEXECDIR})
    install(FILES ${PROJECT_SOURCE_DIR}/tools/man/corvane-transferd.8 DESTINATION ${CMAKE_INSTALL_MANDIR}/man8)
endif()

# A package of its own, which asks for nothing: a project in C finds it without a C++ compiler, and without what the
# library is made of.
if(CORVANE_BUILD_C_LIBRARY)
    set(c_package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/corvane_c)
    install(TARGETS corvane_c EXPORT corvane_cTargets
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
        FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
    install(EXPORT corvane_cTargets NAMESPACE corvane:: FILE corvane_cConfig.cmake DESTINATION ${c_package_dir})
    write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/corvane_cConfigVersion.cmake
        COMPATIBILITY AnyNewerVersion)
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/corvane_cConfigVersion.cmake DESTINATION ${c_package_dir})
endif()

# A set of its own: it needs zlib, which a user of the shared library may not have.
if(CORVANE_BUILD_TESTING_LIBRARY)
    install(TARGETS corvane_testing EXPORT corvaneTestingTargets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
        FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
        FILE_SET matchers DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
endif()

set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/corvane)
install(EXPORT corvaneTargets NAMESPACE corvane:: DESTINATION ${package_dir})
if(CORVANE_BUILD_TESTING_LIBRARY)
    install(EXPORT corvaneTestingTargets NAMESPACE corvane:: DESTINATION ${package_dir})
endif()
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/corvaneConfig.cmake.in
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfig.cmake INSTALL_DESTINATION ${package_dir})
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/corvaneConfigVersion.cmake
    COMPATIBILITY SameMinorVersion)
install(FILES
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfig.cmake
    ${CMAKE_CURRENT_BINARY_DIR}/corvaneConfigVersion.cmake
    ${PROJECT_SOURCE_DIR}/cmake/CorvaneApplicationBundle.cmake
    DESTINATION ${package_dir})

# A static library leaves it to its user to link what it is made of; a shared one brings that itself. The libraries are
# named, and not required as packages: their compiler flags are none of a host's affair, and with --static pkg-config
# would ask for everything that they are made of in turn.
set(pc_libs_extra "")
if(NOT BUILD_SHARED_LIBS)
    set(pc_libs_extra "-lsqlite3 -lz -lcurl -lcrypto -lspdlog -lfmt -lboost_json -lboost_container -pthread")
endif()
# Relative, so that a package may be moved as a whole.
file(RELATIVE_PATH pc_prefix ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
function(corvane_pkg_config pc_name pc_libs_extra)
    configure_file(${PROJECT_SOURCE_DIR}/cmake/corvane.pc.in ${CMAKE_CURRENT_BINARY_DIR}/${pc_name}.pc @ONLY)
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/${pc_name}.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
endfunction()
corvane_pkg_config(corvane "${pc_libs_extra}")
if(CORVANE_BUILD_C_LIBRARY)
    corvane_pkg_config(corvane_c "")
endif()
