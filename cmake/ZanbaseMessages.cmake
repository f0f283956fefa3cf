# Makes message catalogues for tests and examples.

find_program(ZANBASE_MSGFMT msgfmt)

# Compiles `po` with `target` to locale/LANGUAGE/LC_MESSAGES/ZAN.mo in the target's build folder. Without msgfmt
# there is no catalogue, and the target speaks English.
function(zanbase_catalogue target language po)
    if(NOT ZANBASE_MSGFMT)
        return()
    endif()
    set(folder ${CMAKE_CURRENT_BINARY_DIR}/locale/${language}/LC_MESSAGES)
    set(source ${CMAKE_CURRENT_SOURCE_DIR}/${po})
    add_custom_command(OUTPUT ${folder}/ZAN.mo
        COMMAND ${CMAKE_COMMAND} -E make_directory ${folder}
        COMMAND ${ZANBASE_MSGFMT} --check-format --output-file=${folder}/ZAN.mo ${source}
        DEPENDS ${source} VERBATIM)
    target_sources(${target} PRIVATE ${folder}/ZAN.mo)
endfunction()
