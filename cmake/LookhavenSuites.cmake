# SPDX-License-Identifier: Apache-2.0
#
# Read by ctest: registers each suite of a GoogleTest program as one test. See lookhaven_test.
if(EXISTS "${program}")
    execute_process(COMMAND ${emulator} "${program}" --gtest_list_tests OUTPUT_VARIABLE listed COMMAND_ERROR_IS_FATAL ANY)
    string(REGEX MATCHALL "[^\n]+" lines "${listed}")
    foreach(line IN LISTS lines)
        if(line MATCHES "^([^ ]+)\\.( *#.*)?$")
            add_test("${name}.${CMAKE_MATCH_1}" ${emulator} "${program}" "--gtest_filter=${CMAKE_MATCH_1}.*")
            set_tests_properties("${name}.${CMAKE_MATCH_1}" PROPERTIES ${properties})
        endif()
    endforeach()
else()
    add_test(${name}_NOT_BUILT ${name}_NOT_BUILT)
endif()
