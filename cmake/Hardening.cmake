# The options with which the shipped programs are built so that a memory error ends the process instead of
# helping an attacker: every user of the machine may send the service a datagram. Only for optimised builds:
# the fortified functions need the optimiser, and the sanitizers have checks of their own.
include(CheckCXXCompilerFlag)
include(CheckLinkerFlag)
include(CheckPIESupported)

# Programs are loaded at an address that changes with each start. Without this check, CMake compiles for that
# but does not link for it.
check_pie_supported(OUTPUT_VARIABLE pie_output LANGUAGES CXX)
if(NOT CMAKE_CXX_LINK_PIE_SUPPORTED)
    message(WARNING "The programs will not be position-independent: ${pie_output}")
endif()

target_compile_options(ssr_options INTERFACE
    # A canary in each function that has an array, or a variable whose address is passed on.
    -fstack-protector-strong
    # The C library's functions check the size of the memory that they write to. Level 3 also checks sizes
    # that are known only at run time. It is undefined first, because the compilers of some distributions
    # define it at another level.
    -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=3)

# Options that only some architectures or linkers have. The test what_ships_is_hardened reads
# SSR_HARDENING_FLAGS.
set(SSR_HARDENING_FLAGS -fstack-protector-strong)
foreach(flag IN ITEMS
        -fstack-clash-protection # no stack frame can skip the guard page
        -fcf-protection) # x86: a jump to a wrong target ends the process, if the processor checks it
    string(MAKE_C_IDENTIFIER "SSR_HAS${flag}" known)
    check_cxx_compiler_flag(${flag} ${known})
    if(${known})
        target_compile_options(ssr_options INTERFACE ${flag})
        list(APPEND SSR_HARDENING_FLAGS ${flag})
    endif()
endforeach()

foreach(flag IN ITEMS
        -Wl,-z,relro,-z,now # all symbols are resolved at the start, and their tables are then read-only
        -Wl,-z,noexecstack) # one assembler object without a stack note would make all stacks executable
    string(MAKE_C_IDENTIFIER "SSR_HAS${flag}" known)
    check_linker_flag(CXX ${flag} ${known})
    if(${known})
        target_link_options(ssr_options INTERFACE ${flag})
    endif()
endforeach()
