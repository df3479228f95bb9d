include(GoogleTest)

# ssr_put_beside(<program> <folder> [<plug-in>...]): builds the program into that folder and copies the
# plug-ins there.
function(ssr_put_beside program folder)
    set_target_properties(${program} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${folder})
    foreach(plugin IN LISTS ARGN)
        add_dependencies(${program} ${plugin})
        add_custom_command(TARGET ${program} PRE_LINK COMMAND ${CMAKE_COMMAND} -E copy_if_different
            $<TARGET_FILE:${plugin}> ${folder}/$<TARGET_FILE_NAME:${plugin}>)
        set_property(TARGET ${program} APPEND PROPERTY LINK_DEPENDS $<TARGET_FILE:${plugin}>)
    endforeach()
endfunction()

# ssr_precompile_test_headers(<program>): compiles the headers that nearly every test includes once for the
# whole program, when that is less work than to compile them for each file. A test's file took three seconds,
# and two of them were for these headers.
function(ssr_precompile_test_headers program)
    get_target_property(sources ${program} SOURCES)
    list(LENGTH sources count)
    if(count LESS 3)
        return()
    endif()
    target_precompile_headers(${program} PRIVATE
        <chrono> <filesystem> <fstream> <functional> <map> <optional> <string> <thread> <vector>
        <gmock/gmock.h> <gtest/gtest.h>)
    if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
        # Without -fpch-preprocess, ccache does not cache such a file. With a precompiled header, GCC 12
        # wrongly reports some inlined copies of std::string as reads and writes out of bounds. The sources
        # that ship keep these warnings.
        target_compile_options(${program} PRIVATE
            -fpch-preprocess -Wno-array-bounds -Wno-restrict -Wno-stringop-overflow -Wno-stringop-overread)
    endif()
endfunction()

# ssr_add_test(<name> [SANDBOX] [EARLY] [SOURCES <file>...] [LINK <target>...] [FAKES <target>...]
#     [LABELS <label>...] [SERIAL <filter>])
#
# A test program in a folder of its own. A program loads its plug-ins from its own folder, so the FAKES are
# put there: plug-ins with the file names of the real ones. A plug-in that is not named is missing for that
# program. With SANDBOX, each test has port 9997 and the pid file's directory for itself (see in-sandbox).
# EARLY tests wait for seconds (for a lock, for a time-out), so they start before the others, which run
# meanwhile. The filter SERIAL, in GoogleTest's syntax, names tests that run alone: what they measure would be
# wrong beside other tests.
function(ssr_add_test name)
    cmake_parse_arguments(arg "SANDBOX;EARLY" "SERIAL" "SOURCES;LINK;FAKES;LABELS" ${ARGN})
    set(folder ${PROJECT_BINARY_DIR}/tests/${name})
    add_executable(${name} ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE ssr_options ${arg_LINK} GTest::gmock_main GTest::gtest)
    ssr_precompile_test_headers(${name})
    ssr_put_beside(${name} ${folder} ${arg_FAKES})
    if(arg_SANDBOX)
        # CMake's name for the program that starts the test's program.
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
