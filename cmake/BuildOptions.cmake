# What every target of ours is built with. A target gets the warnings, the sanitizers and the hardening by linking
# ssr_options. Set for all targets is only what a static library and its users must agree on (the language level, position
# independence, visibility) and what concerns the build itself (the build type, ccache, compile_commands.json).
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
    # The sloppiness is what ccache asks for before it caches anything that uses a precompiled header. The base folder
    # and no hash of the working one: a second clone or work tree finds what the first one compiled.
    set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env
        CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime
        CCACHE_BASEDIR=${PROJECT_SOURCE_DIR} CCACHE_NOHASHDIR=true ${SSR_CCACHE})
endif()

add_library(ssr_options INTERFACE)
target_include_directories(ssr_options INTERFACE ${PROJECT_SOURCE_DIR})
target_compile_options(ssr_options INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor
    -Woverloaded-virtual -Wconversion)
# Not by default: a compiler newer than ours has warnings that ours has not, and who packages this must be able to build.
if(SSR_WERROR)
    target_compile_options(ssr_options INTERFACE -Werror)
endif()

if(NOT APPLE)
    # By which debug symbols, crash reports and `reportctl --version` tell builds apart; not every compiler asks for it.
    target_link_options(ssr_options INTERFACE -Wl,--build-id=sha1)
endif()

if(SSR_SANITIZE)
    target_compile_options(ssr_options INTERFACE -fsanitize=${SSR_SANITIZE} -fno-sanitize-recover=all
        -fno-omit-frame-pointer)
    # With a sanitizer, GCC takes values of std::regex for uninitialised that are not; its manual says that it may.
    target_compile_options(ssr_options INTERFACE $<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized>)
    target_link_options(ssr_options INTERFACE -fsanitize=${SSR_SANITIZE})
    add_library(ssr_sanitizer_options OBJECT ${CMAKE_CURRENT_LIST_DIR}/SanitizerOptions.cpp)
    target_sources(ssr_options INTERFACE
        $<$<STREQUAL:$<TARGET_PROPERTY:TYPE>,EXECUTABLE>:$<TARGET_OBJECTS:ssr_sanitizer_options>>)
endif()

if(SSR_COVERAGE)
    # Counted with atomic operations: several threads run the same lines.
    target_compile_options(ssr_options INTERFACE --coverage -fprofile-update=atomic)
    target_link_options(ssr_options INTERFACE --coverage)
endif()

if(NOT SSR_SANITIZE AND NOT SSR_COVERAGE AND NOT CMAKE_BUILD_TYPE STREQUAL "Debug")
    set(SSR_HARDENED TRUE)
    include(Hardening)
endif()

if(SSR_FUZZ)
    # Every target counts what it runs, the plug-ins too; only a fuzz target gets libFuzzer's main.
    target_compile_options(ssr_options INTERFACE -fsanitize=fuzzer-no-link
        -fsanitize-ignorelist=${PROJECT_SOURCE_DIR}/fuzz/ignored-undefined-behaviour)
endif()
