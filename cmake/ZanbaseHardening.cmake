# What the compiler and the linker add so that a fault in the library is harder to exploit. docs/benchmarks.md has the
# cost of each; tests/package/hardened.sh looks for their traces in the built file. Not with sanitizers, which check the same
# more closely.

set(ZANBASE_HARDENING fortify stack-protector assertions control-flow CACHE STRING
    "Protections that are compiled in, of: fortify stack-protector assertions control-flow")

set(fortify -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2)
set(stack-protector -fstack-protector-strong)
set(assertions -D_GLIBCXX_ASSERTIONS)
if(CMAKE_SYSTEM_PROCESSOR MATCHES "^(x86_64|amd64|AMD64)$")
    set(control-flow -fcf-protection=full)
elseif(CMAKE_SYSTEM_PROCESSOR STREQUAL aarch64)
    set(control-flow -mbranch-protection=standard)
else()
    set(control-flow)  # other processors have none
endif()

# Compiles `objects` with the protections, and links each further target without writable tables of addresses,
# relocations in its code, or code on the stack; for Windows at addresses that the system chooses anew, with no code in
# data. MinGW has fewer: its own formatting replaces what `fortify` would check, and g++ makes no tables for the system's
# control-flow guard.
function(zanbase_harden objects)
    if(CMAKE_CXX_FLAGS MATCHES -fsanitize)
        return()
    endif()
    set(link -Wl,-z,relro -Wl,-z,now -Wl,-z,text -Wl,-z,noexecstack)
    if(WIN32)
        list(REMOVE_ITEM ZANBASE_HARDENING fortify control-flow)
        set(link -Wl,--dynamicbase,--high-entropy-va,--nxcompat)
    endif()
    foreach(protection IN LISTS ZANBASE_HARDENING)
        # The C library's checks need an optimised build.
        target_compile_options(${objects} PRIVATE "$<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:${${protection}}>")
    endforeach()
    foreach(target IN LISTS ARGN)
        target_link_options(${target} PRIVATE ${link})
    endforeach()
endfunction()
