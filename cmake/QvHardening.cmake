# Hardening of everything we build (the shipped plug-in, platform libraries and tools, and
# the static libraries linked into them): position-independent executables, full RELRO
# with immediate binding, a non-executable stack, stack protection of functions with
# arrays or address-taken locals, and glibc's checked string and memory functions.
# tests/package/hardening.sh checks the result on the shipped binaries with readelf.

include(CheckPIESupported)
check_pie_supported(OUTPUT_VARIABLE QV_PIE_MESSAGE LANGUAGES C CXX)
if(NOT CMAKE_CXX_LINK_PIE_SUPPORTED)
  message(FATAL_ERROR "the C++ toolchain cannot link position-independent executables: "
                      "${QV_PIE_MESSAGE}")
endif()
# With CMAKE_POSITION_INDEPENDENT_CODE ON (top-level) and the check above, CMake compiles
# executables with -fPIE and links them with -pie, libraries with -fPIC.

add_compile_options(-fstack-protector-strong)
add_link_options(-Wl,-z,relro -Wl,-z,now -Wl,-z,noexecstack)

# glibc checks the buffer sizes it can see only when optimising (and warns without
# optimisation, which -Werror turns into a failure): optimised configurations only. The
# sanitizer builds leave it out, as their own checks cover the same ground more closely.
if(NOT QV_SANITIZE)
  set(QV_OPTIMISED_CONFIG "$<CONFIG:Release,RelWithDebInfo,MinSizeRel>")
  add_compile_options("$<${QV_OPTIMISED_CONFIG}:-U_FORTIFY_SOURCE>"
                      "$<${QV_OPTIMISED_CONFIG}:-D_FORTIFY_SOURCE=2>")
endif()
