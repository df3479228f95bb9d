# What the shipped programs are built with so that a memory error ends the process instead of serving the attacker:
# every user of the machine may send the service a datagram. Optimised builds only: the fortified functions need the
# optimiser, and the sanitizers bring checks of their own.
include(CheckCXXCompilerFlag)
include(CheckLinkerFlag)
include(CheckPIESupported)

# Programs at an address that changes with each start. Without this check CMake compiles for it but does not link for it.
check_pie_supported(OUTPUT_VARIABLE pie_output LANGUAGES CXX)
if(NOT CMAKE_CXX_LINK_PIE_SUPPORTED)
    message(WARNING "The programs will not be position-independent: ${pie_output}")
endif()

target_compile_options(ssr_options INTERFACE
    # A canary in each function with an array or with a variable whose address leaves it.
    -fstack-protector-strong
    # The C library's functions check the room they write to, at level 3 also room whose size only the run knows. Undefined
    # first: some distributions' compilers define it by themselves, at another level.
    -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=3)

# What only some architectures or linkers have. The test what_ships_is_hardened asks for SSR_HARDENING_FLAGS.
set(SSR_HARDENING_FLAGS -fstack-protector-strong)
foreach(flag IN ITEMS
        -fstack-clash-protection # no stack frame steps over the guard page
        -fcf-protection) # x86: a call or return to anywhere but its target ends the process, where the processor checks it
    string(MAKE_C_IDENTIFIER "SSR_HAS${flag}" known)
    check_cxx_compiler_flag(${flag} ${known})
    if(${known})
        target_compile_options(ssr_options INTERFACE ${flag})
        list(APPEND SSR_HARDENING_FLAGS ${flag})
    endif()
endforeach()

foreach(flag IN ITEMS
        -Wl,-z,relro,-z,now # everything is resolved at the start, and the tables of that are read-only from then on
        -Wl,-z,noexecstack) # else one object of assembler without a note about its stack would make all stacks executable
    string(MAKE_C_IDENTIFIER "SSR_HAS${flag}" known)
    check_linker_flag(CXX ${flag} ${known})
    if(${known})
        target_link_options(ssr_options INTERFACE ${flag})
    endif()
endforeach()
