include(GoogleTest)

# ssr_put_beside(<program> <folder> [<plug-in>...]): builds the program into that folder and puts the plug-ins beside it.
function(ssr_put_beside program folder)
    set_target_properties(${program} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${folder})
    foreach(plugin IN LISTS ARGN)
        add_dependencies(${program} ${plugin})
        add_custom_command(TARGET ${program} PRE_LINK COMMAND ${CMAKE_COMMAND} -E copy_if_different
            $<TARGET_FILE:${plugin}> ${folder}/$<TARGET_FILE_NAME:${plugin}>)
        set_property(TARGET ${program} APPEND PROPERTY LINK_DEPENDS $<TARGET_FILE:${plugin}>)
    endforeach()
endfunction()

# ssr_precompile_test_headers(<program>): compiles what nearly every test includes once for the program, where that is less
# work than to compile it for each of its files: two seconds of the three that a test's file took.
function(ssr_precompile_test_headers program)
    get_target_property(sources ${program} SOURCES)
    list(LENGTH sources count)
    if(count LESS 3)
        return()
    endif()
    target_precompile_headers(${program} PRIVATE <chrono> <filesystem> <fstream> <functional> <map> <optional> <string>
        <thread> <vector> <gmock/gmock.h> <gtest/gtest.h>)
    if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
        # -fpch-preprocess: without it, ccache does not cache such a file. With a precompiled header, GCC 12 takes some
        # inlined copies of std::string for reads and writes out of bounds; the sources of what ships keep the warnings.
        target_compile_options(${program} PRIVATE -fpch-preprocess -Wno-array-bounds -Wno-restrict -Wno-stringop-overflow
            -Wno-stringop-overread)
    endif()
endfunction()

# ssr_add_test(<name> [SANDBOX] [EARLY] [SOURCES <file>...] [LINK <target>...] [FAKES <target>...]
#     [LABELS <label>...] [SERIAL <filter>])
#
# A test program in a folder of its own. A program loads its plug-ins from its own folder, so the FAKES, plug-ins under
# the real ones' file names, are put there; a plug-in that is not named is missing for that program. With SANDBOX, each
# test runs with port 9997 and the pid file's directory to itself (see in-sandbox). EARLY tests wait for seconds (a lock, a
# time-out), so they start before the others, which work meanwhile. The tests that the filter SERIAL names, in GoogleTest's
# words, have the machine to themselves: what they say about time would not hold beside others.
function(ssr_add_test name)
    cmake_parse_arguments(arg "SANDBOX;EARLY" "SERIAL" "SOURCES;LINK;FAKES;LABELS" ${ARGN})
    set(folder ${PROJECT_BINARY_DIR}/tests/${name})
    add_executable(${name} ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE ssr_options ${arg_LINK} GTest::gmock_main GTest::gtest)
    ssr_precompile_test_headers(${name})
    ssr_put_beside(${name} ${folder} ${arg_FAKES})
    if(arg_SANDBOX)
        # The launcher of the test's program, in CMake's words.
        set_property(TARGET ${name} PROPERTY CROSSCOMPILING_EMULATOR ${PROJECT_SOURCE_DIR}/tests/in-sandbox)
    endif()
    set(discovery TEST_PREFIX ${name}. WORKING_DIRECTORY ${folder} DISCOVERY_TIMEOUT 60)
    set(properties TIMEOUT 120)
    if(arg_EARLY)
        list(APPEND properties COST 100)
    endif()
    if(arg_LABELS)
        list(APPEND properties LABELS ${arg_LABELS})
    endif()
    if(NOT arg_SERIAL)
        gtest_discover_tests(${name} ${discovery} PROPERTIES ${properties})
        return()
    endif()
    gtest_discover_tests(${name} ${discovery} TEST_FILTER -${arg_SERIAL} PROPERTIES ${properties})
    gtest_discover_tests(${name} ${discovery} TEST_FILTER ${arg_SERIAL} TEST_LIST ${name}_SERIAL_TESTS
        PROPERTIES ${properties} RUN_SERIAL TRUE)
endfunction()
