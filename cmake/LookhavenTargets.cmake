# SPDX-License-Identifier: Apache-2.0
#
# One interface target that carries the warnings and sanitizers of all code of ours.
add_library(lookhaven_options INTERFACE)
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

# lookhaven_library(<name> <source>...): a static library of one folder.
function(lookhaven_library name)
    add_library(${name} STATIC ${ARGN})
    target_link_libraries(${name} PUBLIC lookhaven_options)
endfunction()

# lookhaven_test(<name> <label> SOURCES <source>... LIBRARIES <library>... [TIMEOUT <seconds>] [ALONE]): a GoogleTest
# program that ctest runs as one test under the given label (unit, component, system); ALONE: not beside others, for it
# looks at times.
function(lookhaven_test name label)
    cmake_parse_arguments(arg "ALONE" "TIMEOUT" "SOURCES;LIBRARIES" ${ARGN})
    add_executable(${name} ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE lookhaven_options ${arg_LIBRARIES} GTest::gmock GTest::gtest GTest::gtest_main)
    add_test(NAME ${name} COMMAND ${name})
    if(NOT arg_TIMEOUT)
        set(arg_TIMEOUT 120)
    endif()
    set_tests_properties(${name} PROPERTIES LABELS ${label} TIMEOUT ${arg_TIMEOUT} RUN_SERIAL ${arg_ALONE})
endfunction()
