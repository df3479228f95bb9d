# The settings that all our targets are built with. A target gets the warnings, the sanitizers and the
# hardening when it links ssr_options. Only these are set for all targets: what a static library and its users
# must agree on (language level, position independence, visibility), and what concerns the build itself (build
# type, ccache, compile_commands.json).
set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

if(NOT CMAKE_BUILD_TYPE)
    set(CMAKE_BUILD_TYPE RelWithDebInfo)
endif()

find_program(SSR_CCACHE ccache)
if(SSR_CCACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
    # Without this sloppiness, ccache caches nothing that uses a precompiled header. With the base folder and
    # without the hash of the working folder, a second clone or work tree finds what the first one compiled.
    set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env
        CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime
        CCACHE_BASEDIR=${PROJECT_SOURCE_DIR} CCACHE_NOHASHDIR=true ${SSR_CCACHE})
endif()

add_library(ssr_options INTERFACE)
target_include_directories(ssr_options INTERFACE ${PROJECT_SOURCE_DIR})
target_compile_options(ssr_options INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor
    -Woverloaded-virtual -Wconversion)
# Not by default: a newer compiler has warnings that ours does not have, and a packager must still be able to
# build this.
if(SSR_WERROR)
    target_compile_options(ssr_options INTERFACE -Werror)
endif()

if(NOT APPLE)
    # Debug symbols, crash reports and `reportctl --version` identify a build by its build id. Not every
    # compiler asks the linker for one.
    target_link_options(ssr_options INTERFACE -Wl,--build-id=sha1)
endif()

if(SSR_SANITIZE)
    target_compile_options(ssr_options INTERFACE -fsanitize=${SSR_SANITIZE} -fno-sanitize-recover=all
        -fno-omit-frame-pointer)
    # With a sanitizer, GCC wrongly warns that values of std::regex are uninitialised. GCC's manual mentions
    # such warnings.
    target_compile_options(ssr_options INTERFACE $<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized>)
    target_link_options(ssr_options INTERFACE -fsanitize=${SSR_SANITIZE})
    add_library(ssr_sanitizer_options OBJECT ${CMAKE_CURRENT_LIST_DIR}/SanitizerOptions.cpp)
    target_sources(ssr_options INTERFACE
        $<$<STREQUAL:$<TARGET_PROPERTY:TYPE>,EXECUTABLE>:$<TARGET_OBJECTS:ssr_sanitizer_options>>)
endif()

if(SSR_COVERAGE)
    # Counts with atomic operations, because several threads run the same lines.
    target_compile_options(ssr_options INTERFACE --coverage -fprofile-update=atomic)
    target_link_options(ssr_options INTERFACE --coverage)
endif()

if(NOT SSR_SANITIZE AND NOT SSR_COVERAGE AND NOT CMAKE_BUILD_TYPE STREQUAL "Debug")
    set(SSR_HARDENED TRUE)
    include(Hardening)
endif()

if(SSR_FUZZ)
    # Every target counts the code that it runs, also the plug-ins. Only a fuzz target gets libFuzzer's main.
    target_compile_options(ssr_options INTERFACE -fsanitize=fuzzer-no-link
        -fsanitize-ignorelist=${PROJECT_SOURCE_DIR}/fuzz/ignored-undefined-behaviour)
endif()
