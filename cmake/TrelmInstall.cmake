# Install rules, the CMake package, trelm.pc and the Debian package.
#
# Installed tree (<prefix> as given to cmake --install, /usr in the Debian package):
#   lib/libtrelm.so.<version>, .so.<major>, .so   the framework
#   include/trelm/*.h                            framework, component and built-in component headers
#   lib/trelm/plugins/libtrelmfacebook.so        the plug-in folder
#   lib/cmake/trelm/                             find_package(trelm CONFIG) -> trelm::trelm
#   lib/pkgconfig/trelm.pc                       pkg-config --cflags --libs trelm
#   bin/trelm-host, bin/trelm-emulator           the programs (when built)
#   share/trelm/demo.json                        the demo configuration
#   share/doc/trelm/                             copyright and changelog
include(CMakePackageConfigHelpers)

set(trelm_cmake_dir ${CMAKE_INSTALL_LIBDIR}/cmake/trelm)

install(TARGETS trelm EXPORT trelmTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    COMPONENT Runtime NAMELINK_COMPONENT Development
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
# One folder for every public header: a plug-in writer needs the framework and the component
# classes, a host writer also the built-in components it creates.
foreach(dir
    ${PROJECT_SOURCE_DIR}/Core/Common/Include/trelm/
    ${PROJECT_SOURCE_DIR}/Core/Components/Include/
    ${PROJECT_SOURCE_DIR}/Core/Components/Host/)
  install(DIRECTORY ${dir} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/trelm
    COMPONENT Development FILES_MATCHING PATTERN "*.h")
endforeach()

install(TARGETS trelmfacebook LIBRARY DESTINATION ${TRELM_PLUGIN_INSTALL_DIR} COMPONENT Runtime)
if(TARGET trelm-host)
  install(TARGETS trelm-host RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT Runtime)
  install(FILES ${PROJECT_SOURCE_DIR}/Tools/trelm-host/demo.json
    DESTINATION ${CMAKE_INSTALL_DATADIR}/trelm COMPONENT Runtime)
endif()
if(TARGET trelm-emulator)
  install(TARGETS trelm-emulator RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT Runtime)
endif()

# The CMake package.
install(EXPORT trelmTargets NAMESPACE trelm:: DESTINATION ${trelm_cmake_dir}
  COMPONENT Development)
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/trelmConfig.cmake.in
  ${PROJECT_BINARY_DIR}/trelmConfig.cmake
  INSTALL_DESTINATION ${trelm_cmake_dir}
  PATH_VARS CMAKE_INSTALL_INCLUDEDIR TRELM_PLUGIN_INSTALL_DIR)
# Before 1.0 a minor version may break the interface.
write_basic_package_version_file(${PROJECT_BINARY_DIR}/trelmConfigVersion.cmake
  COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/trelmConfig.cmake ${PROJECT_BINARY_DIR}/trelmConfigVersion.cmake
  DESTINATION ${trelm_cmake_dir} COMPONENT Development)

# trelm.pc carries the prefix the tree is installed to, which is known only when installing
# (cmake --install --prefix, or /usr when CPack stages the Debian package): everything else is
# filled in now, the prefix by the install step.
set(TRELM_PC_PREFIX "@TRELM_PC_PREFIX@")
configure_file(${CMAKE_CURRENT_LIST_DIR}/trelm.pc.in ${PROJECT_BINARY_DIR}/trelm.pc.in @ONLY)
install(CODE "
  set(TRELM_PC_PREFIX \"\${CMAKE_INSTALL_PREFIX}\")
  configure_file(\"${PROJECT_BINARY_DIR}/trelm.pc.in\" \"${PROJECT_BINARY_DIR}/trelm.pc\" @ONLY)
  " COMPONENT Development)
install(FILES ${PROJECT_BINARY_DIR}/trelm.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig
  COMPONENT Development)

# Copyright and changelog, where Debian looks for them.
set(TRELM_DEB_RELEASE 1)
set(TRELM_DEB_VERSION ${PROJECT_VERSION}-${TRELM_DEB_RELEASE})
configure_file(${CMAKE_CURRENT_LIST_DIR}/debian/copyright.in ${PROJECT_BINARY_DIR}/doc/copyright @ONLY)
configure_file(${CMAKE_CURRENT_LIST_DIR}/debian/changelog.in ${PROJECT_BINARY_DIR}/doc/changelog.Debian @ONLY)
find_program(TRELM_GZIP gzip REQUIRED)
execute_process(COMMAND ${TRELM_GZIP} -9nkf ${PROJECT_BINARY_DIR}/doc/changelog.Debian
  COMMAND_ERROR_IS_FATAL ANY)
install(FILES ${PROJECT_BINARY_DIR}/doc/copyright ${PROJECT_BINARY_DIR}/doc/changelog.Debian.gz
  DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT Runtime)

# The Debian package: everything above in one package, "trelm", installed under /usr. Its
# dependencies on Debian's runtime libraries (libc6, libstdc++6, libgcc-s1, libcurl4, libexpat1,
# libssl3, libuuid1, libsqlite3-0) are read from the binaries by dpkg-shlibdeps, with the versions
# the build was linked against.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME ${PROJECT_NAME})
set(CPACK_PACKAGE_VENDOR "the trelm developers")
set(CPACK_PACKAGE_CONTACT "trelm developers <dev@trelm.example>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "component host framework and Facebook REST plug-in")
set(CPACK_PACKAGE_DESCRIPTION
  "libtrelm is a framework for component hosts: value types, errors, messaging
between named components, data sources and connectors, HTTP, XML and a runtime
configuration store. The package also holds the plug-in libtrelmfacebook, which
connects a device to the Facebook REST service, the command-line host
trelm-host and the service emulator trelm-emulator, with the headers, CMake
package and pkg-config file for building hosts and plug-ins.")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_RELEASE ${TRELM_DEB_RELEASE})
set(CPACK_DEBIAN_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_HOMEPAGE ${PROJECT_HOMEPAGE_URL})
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${PROJECT_BINARY_DIR}/lib)
# libtrelm in /usr/lib: the library cache is refreshed by dpkg's ldconfig trigger, and the
# maintainer scripts that would otherwise call ldconfig are replaced by ones that do nothing.
set(CPACK_DEBIAN_PACKAGE_CONTROL_EXTRA
  ${CMAKE_CURRENT_LIST_DIR}/debian/triggers
  ${CMAKE_CURRENT_LIST_DIR}/debian/postinst
  ${CMAKE_CURRENT_LIST_DIR}/debian/postrm)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
include(CPack)
