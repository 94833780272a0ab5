# Debian packages of what we ship (CPack DEB, one package per install component), for the
# architecture of this build tree: amd64 natively, armhf from the cross build.
#
#   qv-variable-iotolvane         component "plugin": the plug-in alone, for a target that
#                                 has the vendor's host runtime and platform libraries
#   qv-variable-iotolvane-devkit  component "devkit": our builds of the three platform
#                                 libraries and the tools qv-webhost, qv-registry, qv-discover
#
# scripts/package runs cpack in the default and armhf build trees; tests/package checks the
# result. The install rules sit beside their targets; the folders are in QvInstallDirs.cmake.

# The readelf check of the shipped binaries' hardening (tests/package/CMakeLists.txt).
if(QV_BUILD_TESTS)
  add_subdirectory(${PROJECT_SOURCE_DIR}/tests/package ${PROJECT_BINARY_DIR}/tests/package)
endif()

# The Debian architecture from the compiler's multiarch triplet.
set(QV_DEB_ARCHITECTURE "")
find_program(QV_DPKG_ARCHITECTURE dpkg-architecture)
if(QV_DPKG_ARCHITECTURE AND CMAKE_LIBRARY_ARCHITECTURE)
  execute_process(
    COMMAND ${QV_DPKG_ARCHITECTURE} -t ${CMAKE_LIBRARY_ARCHITECTURE} -qDEB_HOST_ARCH
    OUTPUT_VARIABLE QV_DEB_ARCHITECTURE
    OUTPUT_STRIP_TRAILING_WHITESPACE
    ERROR_QUIET)
endif()
if(NOT QV_DEB_ARCHITECTURE)
  set(QV_DEB_ARCHITECTURE_OF_x86_64-linux-gnu amd64)
  set(QV_DEB_ARCHITECTURE_OF_arm-linux-gnueabihf armhf)
  set(QV_DEB_ARCHITECTURE "${QV_DEB_ARCHITECTURE_OF_${CMAKE_LIBRARY_ARCHITECTURE}}")
endif()
if(NOT QV_DEB_ARCHITECTURE)
  message(STATUS "Packaging: no Debian architecture for '${CMAKE_LIBRARY_ARCHITECTURE}'; "
                 "cpack is not configured")
  return()
endif()

set(QV_DEB_PLUGIN_PACKAGE qv-variable-iotolvane)
set(QV_DEB_DEVKIT_PACKAGE qv-variable-iotolvane-devkit)

# What the shipped files need at run time, as dpkg-shlibdeps derives it from their NEEDED
# entries and symbol versions on Debian 12: GLIBC_2.34, GLIBCXX_3.4.29 and CXXABI_1.3.13
# (GCC 11), Avahi 0.6.16 symbols, and libgcc_s GCC_3.0 (GCC_3.5 on armhf, whose unwinder
# symbols carry that version). Boost is used from headers only. Set here because
# dpkg-shlibdeps cannot see the vendor's libraries the plug-in links against;
# tests/package/install_check.sh compares it with what dpkg-shlibdeps derives from the
# packaged files of each architecture.
set(QV_DEB_LIBGCC_VERSION 3.0)
if(QV_DEB_ARCHITECTURE STREQUAL "armhf")
  set(QV_DEB_LIBGCC_VERSION 3.5)
endif()
set(QV_DEB_RUNTIME_DEPENDS
    "libavahi-client3 (>= 0.6.16), libavahi-common3 (>= 0.6.16), libc6 (>= 2.34), libgcc-s1 (>= ${QV_DEB_LIBGCC_VERSION}), libstdc++6 (>= 11)")

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME ${QV_DEB_PLUGIN_PACKAGE})
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGE_VENDOR "qv_remoteconfig developers")
set(CPACK_PACKAGE_CONTACT "qv_remoteconfig developers <qv-remoteconfig@invalid>")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_ALL plugin devkit)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_ARCHITECTURE ${QV_DEB_ARCHITECTURE})
set(CPACK_DEBIAN_PACKAGE_SECTION misc)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS OFF)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)

set(CPACK_DEBIAN_PLUGIN_PACKAGE_NAME ${QV_DEB_PLUGIN_PACKAGE})
set(CPACK_DEBIAN_PLUGIN_PACKAGE_DEPENDS "${QV_DEB_RUNTIME_DEPENDS}")
set(CPACK_COMPONENT_PLUGIN_DESCRIPTION
    "remote configuration of I/O variables: the web-service plug-in
The shared library libqv_variable_iotolvane.so, loaded by the host web-service
runtime, forwards each remote-configuration request to the registry service over
/tmp/qvPortableRegistry and announces the target by DNS-SD (_qv-iovar._tcp).

It needs the host runtime (libws_runtime.so.13), the Avahi wrapper
(libqvAvahiClient.so.14) and the target-configuration library (libqvtargetcfg.so.1):
the vendor's on a target, or the ones of ${QV_DEB_DEVKIT_PACKAGE} off-target.")

set(CPACK_DEBIAN_DEVKIT_PACKAGE_NAME ${QV_DEB_DEVKIT_PACKAGE})
set(CPACK_DEBIAN_DEVKIT_PACKAGE_DEPENDS "${QV_DEB_RUNTIME_DEPENDS}")
set(CPACK_DEBIAN_DEVKIT_PACKAGE_RECOMMENDS "${QV_DEB_PLUGIN_PACKAGE} (= ${PROJECT_VERSION})")
set(CPACK_COMPONENT_DEVKIT_DESCRIPTION
    "remote configuration of I/O variables: development platform and tools
Development builds of the platform pieces the plug-in runs against, to run it
away from the target: libws_runtime.so.13 (host runtime request functions),
libqvAvahiClient.so.14 (threaded Avahi poll and client) and libqvtargetcfg.so.1
(default MAC address); qv-webhost (HTTP host that loads the plug-in), qv-registry
(development registry service) and qv-discover (lists announced targets).

Do not install it on a target that has the vendor's libraries of the same names.")

# The devkit ships shared libraries on the loader's path: a shlibs file naming them, and
# an ldconfig trigger instead of maintainer scripts.
set(QV_DEB_CONTROL_DIR ${PROJECT_BINARY_DIR}/packaging/devkit)
file(WRITE ${QV_DEB_CONTROL_DIR}/shlibs
     "libws_runtime 13 ${QV_DEB_DEVKIT_PACKAGE} (>= ${PROJECT_VERSION})\n"
     "libqvAvahiClient 14 ${QV_DEB_DEVKIT_PACKAGE} (>= ${PROJECT_VERSION})\n"
     "libqvtargetcfg 1 ${QV_DEB_DEVKIT_PACKAGE} (>= ${PROJECT_VERSION})\n")
file(WRITE ${QV_DEB_CONTROL_DIR}/triggers "activate-noawait ldconfig\n")
set(CPACK_DEBIAN_DEVKIT_PACKAGE_CONTROL_EXTRA
    ${QV_DEB_CONTROL_DIR}/shlibs ${QV_DEB_CONTROL_DIR}/triggers)

include(CPack)
