# ssr_embed_file(<target> <name> <file>): gives the target a function `std::string_view <name>()` in the
# namespace `embedded` that returns the file's bytes. So a program needs no data file. Declare the function
# where it is used.
function(ssr_embed_file target name file)
    set(source ${CMAKE_CURRENT_BINARY_DIR}/embedded/${name}.cpp)
    add_custom_command(OUTPUT ${source} DEPENDS ${file} ${PROJECT_SOURCE_DIR}/cmake/EmbedFileStep.cmake
        COMMAND ${CMAKE_COMMAND} -DFILE=${file} -DNAME=${name} -DSOURCE=${source}
            -P ${PROJECT_SOURCE_DIR}/cmake/EmbedFileStep.cmake)
    target_sources(${target} PRIVATE ${source})
endfunction()
