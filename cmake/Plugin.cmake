# ssr_add_plugin(<target> <library name> <source>...)
#
# A plug-in is a shared library that is opened at run time by its exact file name, lib<name>.dylib on every
# platform. It exports CreateModule and DestoryModule and nothing else, so that two plug-ins that link the
# same static library never share state by accident.
#
# The code of a plug-in stays in memory: once opened, a plug-in is never unloaded before the process ends.
# exit() destroys the last loaders while other threads may still run code of a plug-in: in WriteLog, in a
# statement, in an upload that hangs in the file system or in libcurl's resolver. To wait for these threads
# could take for ever. So a plug-in does not destroy objects that are in use, and the linker's flag below
# keeps the code. (macOS needs no flag: it never unloads a library with thread-local variables, and each of
# the plug-ins has some.)
function(ssr_add_plugin target name)
    add_library(${target} MODULE ${ARGN})
    target_link_libraries(${target} PRIVATE ssr_options ssr_package_note)
    set_target_properties(${target} PROPERTIES
        OUTPUT_NAME ${name} PREFIX lib SUFFIX .dylib LIBRARY_OUTPUT_DIRECTORY ${SSR_BIN_DIR})
    if(NOT APPLE)
        set(exports ${PROJECT_SOURCE_DIR}/cmake/plugin.exports)
        target_link_options(${target} PRIVATE
            -Wl,--version-script=${exports} -Wl,--no-undefined -Wl,-z,nodelete)
        set_property(TARGET ${target} APPEND PROPERTY LINK_DEPENDS ${exports})
        if(SSR_SANITIZE)
            # The sanitizer's runtime is in the program, and the linker does not see it here.
            target_link_options(${target} PRIVATE -Wl,-z,undefs)
        endif()
    endif()
endfunction()
