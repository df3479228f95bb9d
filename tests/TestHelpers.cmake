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

# ssr_add_test(<name> [SANDBOX] [SOURCES <file>...] [LINK <target>...] [FAKES <target>...]
#     [LABELS <label>...] [SERIAL <filter>])
#
# A test program in a folder of its own. A program loads its plug-ins from its own folder, so the FAKES, plug-ins under
# the real ones' file names, are put there; a plug-in that is not named is missing for that program. With SANDBOX, each
# test runs with port 9997 and the pid file's directory to itself (see in-sandbox). The tests that the filter SERIAL names,
# in GoogleTest's words, have the machine to themselves: what they say about time would not hold beside others.
function(ssr_add_test name)
    cmake_parse_arguments(arg "SANDBOX" "SERIAL" "SOURCES;LINK;FAKES;LABELS" ${ARGN})
    set(folder ${PROJECT_BINARY_DIR}/tests/${name})
    add_executable(${name} ${arg_SOURCES})
    target_link_libraries(${name} PRIVATE ssr_options ${arg_LINK} GTest::gmock_main GTest::gtest)
    ssr_put_beside(${name} ${folder} ${arg_FAKES})
    if(arg_SANDBOX)
        # The launcher of the test's program, in CMake's words.
        set_property(TARGET ${name} PROPERTY CROSSCOMPILING_EMULATOR ${PROJECT_SOURCE_DIR}/tests/in-sandbox)
    endif()
    set(discovery TEST_PREFIX ${name}. WORKING_DIRECTORY ${folder} DISCOVERY_TIMEOUT 60)
    set(properties TIMEOUT 120)
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
