# SPDX-License-Identifier: Apache-2.0
#
# Target check_headers: no header of the tree leans on its users. A header that its own source includes first is checked
# by the build; each other one is compiled by itself. Configure again where a source's first include has changed.
file(GLOB_RECURSE lookhaven_headers RELATIVE ${CMAKE_SOURCE_DIR}
    webapi/*.h player/*.h platform/*.h standalone/*.h test/*.h bench/*.h)
if(NOT LOOKHAVEN_TESTS)
    list(FILTER lookhaven_headers EXCLUDE REGEX "^test/")
endif()

set(lookhaven_header_sources)
foreach(header IN LISTS lookhaven_headers)
    string(REGEX REPLACE "\\.h$" ".cpp" own_source ${CMAKE_SOURCE_DIR}/${header})
    set(first_include "")
    if(EXISTS ${own_source})
        file(STRINGS ${own_source} first_include REGEX "^#include " LIMIT_COUNT 1)
    endif()
    if(NOT first_include STREQUAL "#include \"${header}\"")
        set(source ${CMAKE_BINARY_DIR}/check_headers/${header}.cpp)
        file(CONFIGURE OUTPUT ${source} CONTENT "#include \"${header}\"\n" @ONLY)
        list(APPEND lookhaven_header_sources ${source})
    endif()
endforeach()

add_library(check_headers OBJECT EXCLUDE_FROM_ALL ${lookhaven_header_sources})
target_link_libraries(check_headers PRIVATE lookhaven_options lookhaven_platform lookhaven_soci
    PkgConfig::jsoncpp PkgConfig::sodium PkgConfig::turbojpeg PkgConfig::libav CLI11::CLI11 Threads::Threads)
if(LOOKHAVEN_TESTS)
    target_link_libraries(check_headers PRIVATE GTest::gmock)
endif()
