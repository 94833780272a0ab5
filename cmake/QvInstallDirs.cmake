# Where the packages put what we ship, relative to the packaging prefix /usr (Debian
# multiarch layout; the triplet comes from the compiler, or from the armhf toolchain file):
#   QV_INSTALL_BINDIR     the development tools              /usr/bin
#   QV_INSTALL_LIBDIR     our builds of the platform libraries /usr/lib/<triplet>
#   QV_INSTALL_PLUGINDIR  the web-service plug-in            /usr/lib/<triplet>/qv-webservices
# The platform libraries sit on the dynamic loader's default path, so the plug-in and the
# tools find them by soname without any RUNPATH; the plug-in is loaded by path (dlopen),
# so it lives in a folder of its own.
set(QV_INSTALL_BINDIR bin)
if(CMAKE_LIBRARY_ARCHITECTURE)
  set(QV_INSTALL_LIBDIR lib/${CMAKE_LIBRARY_ARCHITECTURE})
else()
  set(QV_INSTALL_LIBDIR lib)
endif()
set(QV_INSTALL_PLUGINDIR ${QV_INSTALL_LIBDIR}/qv-webservices)

# The installed plug-in as qv-webhost finds it from its own folder.
file(RELATIVE_PATH QV_PLUGIN_FROM_BINDIR /usr/${QV_INSTALL_BINDIR}
     /usr/${QV_INSTALL_PLUGINDIR}/libqv_variable_iotolvane.so)
