# SPDX-License-Identifier: Apache-2.0
#
# One interface target that carries the warnings and sanitizers of all code of ours.
add_library(lookhaven_options INTERFACE)
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
    # Files beyond 2 GiB and times beyond 2038. Debian 12's libraries are built without, so none of their functions that
    # take or return an off_t or a time_t may be called, but the C library's.
    add_compile_definitions(_FILE_OFFSET_BITS=64 _TIME_BITS=64)
endif()
target_include_directories(lookhaven_options INTERFACE ${CMAKE_SOURCE_DIR})
target_compile_options(lookhaven_options INTERFACE
    -Wall -Wextra -Wshadow -Wconversion -Werror -fvisibility=hidden -fno-omit-frame-pointer)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    # GCC 12 sees overlapping copies in "text" + std::string(...) that are not there.
    target_compile_options(lookhaven_options INTERFACE -Wno-restrict)
endif()
if(LOOKHAVEN_SANITIZE)
    target_compile_options(lookhaven_options INTERFACE -fsanitize=${LOOKHAVEN_SANITIZE} -fno-sanitize-recover=all)
    # The sanitizer's own dlopen calls the real one, which then looks along the older kind of path only.
    target_link_options(lookhaven_options INTERFACE -fsanitize=${LOOKHAVEN_SANITIZE} -Wl,--disable-new-dtags)
endif()

# Linking tests is much of a build, and lld takes a fraction of the time; a cross compiler does not look for it.
find_program(LOOKHAVEN_LLD ld.lld)
if(LOOKHAVEN_TESTS AND LOOKHAVEN_LLD AND NOT CMAKE_CROSSCOMPILING)
    target_link_options(lookhaven_options INTERFACE -fuse-ld=lld)
endif()

# lookhaven_library(<name> <source>...): a static library of one folder.
function(lookhaven_library name)
    add_library(${name} STATIC ${ARGN})
    target_link_libraries(${name} PUBLIC lookhaven_options)
endfunction()

include(GoogleTest)

# Under a sanitizer tests are compiled a second time, half of it GoogleTest's headers. Not in other presets: no cache of
# objects finds in one checkout what was compiled with the precompiled header of another.
if(LOOKHAVEN_TESTS AND LOOKHAVEN_SANITIZE)
    file(CONFIGURE OUTPUT test_headers.cpp CONTENT "int main() {}\n")
    add_executable(lookhaven_test_headers EXCLUDE_FROM_ALL ${CMAKE_CURRENT_BINARY_DIR}/test_headers.cpp)
    target_link_libraries(lookhaven_test_headers PRIVATE lookhaven_options GTest::gmock GTest::gtest)
    target_precompile_headers(lookhaven_test_headers PRIVATE <gmock/gmock.h> <gtest/gtest.h>)
endif()

# lookhaven_test(<name> <label> SOURCES <source>... LIBRARIES <library>... [TIMEOUT <seconds>] [ALONE] [BY_SUITE]
# [LONG]): a GoogleTest program. ctest runs each case as "<name>.<suite>.<case>" in a process of its own, under the
# given label (unit, component, system). Those of one program run one after the other, for they may share segments and
# files of the machine. ALONE: not beside any others, for it looks at times. BY_SUITE: one process per suite, for
# cases that share an expensive set-up. LONG: begun first, so that the others run beside it.
function(lookhaven_test name label)
    cmake_parse_arguments(arg "ALONE;BY_SUITE;LONG" "TIMEOUT" "SOURCES;LIBRARIES" ${ARGN})
    add_executable(${name} ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE lookhaven_options ${arg_LIBRARIES} GTest::gmock GTest::gtest GTest::gtest_main)
    if(TARGET lookhaven_test_headers)
        target_precompile_headers(${name} REUSE_FROM lookhaven_test_headers)
    endif()
    if(NOT arg_TIMEOUT)
        set(arg_TIMEOUT 120)
        if(LOOKHAVEN_SANITIZE)
            set(arg_TIMEOUT 300)  # a program that is started often takes several times as long
        endif()
    endif()
    set(properties LABELS ${label} TIMEOUT ${arg_TIMEOUT} RUN_SERIAL ${arg_ALONE} RESOURCE_LOCK ${name})
    if(arg_LONG)
        list(APPEND properties COST 100)
    endif()
    if(arg_BY_SUITE)
        set(entries ${CMAKE_CURRENT_BINARY_DIR}/${name}_suites.cmake)
        file(GENERATE OUTPUT ${entries} CONTENT "set(name ${name})\nset(program \"$<TARGET_FILE:${name}>\")
set(emulator \"$<TARGET_PROPERTY:${name},CROSSCOMPILING_EMULATOR>\")
set(properties ${properties})\ninclude(\"${CMAKE_SOURCE_DIR}/cmake/LookhavenSuites.cmake\")\n")
        set_property(DIRECTORY APPEND PROPERTY TEST_INCLUDE_FILES ${entries})
    else()
        gtest_discover_tests(${name} TEST_PREFIX "${name}." DISCOVERY_MODE PRE_TEST DISCOVERY_TIMEOUT 60
            PROPERTIES ${properties})
    endif()
endfunction()
