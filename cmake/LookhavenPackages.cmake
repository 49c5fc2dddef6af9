# SPDX-License-Identifier: Apache-2.0
#
# Finds the libraries that we build on; docs/design/dependencies.md says why each.
find_package(PkgConfig REQUIRED)
find_package(Threads REQUIRED)
find_package(OpenSSL REQUIRED)
pkg_check_modules(jsoncpp REQUIRED IMPORTED_TARGET jsoncpp)
pkg_check_modules(libarchive REQUIRED IMPORTED_TARGET libarchive)
pkg_check_modules(libcurl REQUIRED IMPORTED_TARGET libcurl)
pkg_check_modules(seccomp REQUIRED IMPORTED_TARGET libseccomp)
pkg_check_modules(sodium REQUIRED IMPORTED_TARGET libsodium)
pkg_check_modules(turbojpeg REQUIRED IMPORTED_TARGET libturbojpeg)
pkg_check_modules(libav REQUIRED IMPORTED_TARGET libavformat libavcodec libavutil libswscale libswresample)
pkg_check_modules(zlib REQUIRED IMPORTED_TARGET zlib)
find_package(CLI11 REQUIRED)

# Debian's libsoci-dev ships no CMake configuration. The part for PostgreSQL is loaded by its name.
add_library(lookhaven_soci INTERFACE)
foreach(part core sqlite3)
    find_library(SOCI_${part} soci_${part} REQUIRED)
    target_link_libraries(lookhaven_soci INTERFACE ${SOCI_${part}})
endforeach()
find_library(SQLITE3 sqlite3 REQUIRED)
target_link_libraries(lookhaven_soci INTERFACE ${SQLITE3})
find_path(SOCI_INCLUDE soci/soci.h REQUIRED)
find_path(LIBPQ_INCLUDE libpq-fe.h PATH_SUFFIXES postgresql REQUIRED)
target_include_directories(lookhaven_soci SYSTEM INTERFACE ${SOCI_INCLUDE})
if(LOOKHAVEN_SANITIZE MATCHES "undefined")
    # The library hides the type information that this check compares.
    target_compile_options(lookhaven_soci INTERFACE -fno-sanitize=vptr)
endif()

if(LOOKHAVEN_TESTS)
    find_package(GTest REQUIRED)
endif()
