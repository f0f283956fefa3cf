# Link-time optimisation of the shared library in optimised builds, where the compiler has it: the path of a lock is
# three functions in three files, which then become one. CMAKE_INTERPROCEDURAL_OPTIMIZATION, if it is set, decides
# instead.

include(CheckIPOSupported)

# Optimises `library`, which is made of the objects of the targets that follow, as a whole. Other users of the objects
# link `others`: they take the machine code where the compiler writes both forms, because to optimise each test takes longer
# than to build it.
function(zanbase_optimise_at_link library others)
    if(DEFINED CMAKE_INTERPROCEDURAL_OPTIMIZATION OR CMAKE_CXX_FLAGS MATCHES "-fsanitize|--coverage")
        return()
    endif()
    check_ipo_supported(RESULT has_optimisation LANGUAGES CXX)
    if(NOT has_optimisation)
        return()
    endif()
    foreach(configuration IN ITEMS RELEASE RELWITHDEBINFO MINSIZEREL)
        set_property(TARGET ${ARGN} ${library} PROPERTY INTERPROCEDURAL_OPTIMIZATION_${configuration} ON)
    endforeach()
    set(optimised $<CONFIG:Release,RelWithDebInfo,MinSizeRel>)
    if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
        set(whole $<BOOL:$<TARGET_PROPERTY:INTERPROCEDURAL_OPTIMIZATION_RELEASE>>)
        foreach(objects IN LISTS ARGN)
            target_compile_options(${objects} PRIVATE $<${optimised}:-ffat-lto-objects>)
        endforeach()
        # In one piece: it is small, routines in assembly may not be apart from their users, and g++ 12 for Windows
        # fails on several.
        target_link_options(${library} PRIVATE $<${optimised}:-flto-partition=one>)
        target_link_options(${others} INTERFACE $<$<AND:${optimised},$<NOT:${whole}>>:-fno-lto>)
    else()
        target_link_options(${others} INTERFACE $<${optimised}:${CMAKE_CXX_COMPILE_OPTIONS_IPO}>)
    endif()
endfunction()
