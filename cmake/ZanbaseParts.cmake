# The parts of the project that can be left out. Each has an option ZANBASE_BUILD_<PART> with three values: ON builds
# it, or fails if something that it needs is missing; AUTO builds it if everything is there; OFF leaves it out.

# zanbase_part(PART DEFAULT DESCRIPTION)
function(zanbase_part part default description)
    set(ZANBASE_BUILD_${part} ${default} CACHE STRING "${description}: ON, OFF, or AUTO (if what it needs is there)")
    set_property(CACHE ZANBASE_BUILD_${part} PROPERTY STRINGS ON OFF AUTO)
endfunction()

# zanbase_decide(PART [MISSING...]): sets ZANBASE_WITH_<PART>; MISSING is what the part needs and was not found.
function(zanbase_decide part)
    string(REPLACE ";" ", " missing "${ARGN}")
    set(ZANBASE_WITH_${part} ${ZANBASE_BUILD_${part}} PARENT_SCOPE)
    if(NOT ZANBASE_BUILD_${part} OR NOT missing)
        return()
    endif()
    if(NOT ZANBASE_BUILD_${part} STREQUAL AUTO)
        message(FATAL_ERROR "ZANBASE_BUILD_${part} is ${ZANBASE_BUILD_${part}}, but this is missing: ${missing}.")
    endif()
    string(TOLOWER ${part} name)
    message(STATUS "zanbase: the ${name} is left out; missing: ${missing}")
    set(ZANBASE_WITH_${part} OFF PARENT_SCOPE)
endfunction()
