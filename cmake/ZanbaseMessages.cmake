# Makes message catalogues and locales for tests and examples.

find_program(ZANBASE_MSGFMT msgfmt)

# Compiles `po` with `target` to locale/LANGUAGE/LC_MESSAGES/ZAN.mo in the target's build folder. Without msgfmt
# there is no catalogue, and the target's messages stay English.
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

# Makes the locale LANGUAGE_COUNTRY.UTF-8 with `target` in locale/ of the target's build folder, for LOCPATH, where
# the system can: it may have no locale but the C library's own.
find_program(ZANBASE_LOCALEDEF localedef)
function(zanbase_locale target locale)
    set(made ${CMAKE_CURRENT_BINARY_DIR}/locale/${locale}.UTF-8)
    if(WIN32 OR NOT ZANBASE_LOCALEDEF OR NOT EXISTS /usr/share/i18n/locales/${locale})
        return()
    endif()
    set(order --little-endian)
    if(CMAKE_CXX_BYTE_ORDER STREQUAL BIG_ENDIAN)
        set(order --big-endian)
    endif()
    add_custom_command(OUTPUT ${made}/LC_NUMERIC
        COMMAND ${CMAKE_COMMAND} -E make_directory ${CMAKE_CURRENT_BINARY_DIR}/locale
        COMMAND ${ZANBASE_LOCALEDEF} ${order} -i ${locale} -f UTF-8 ${made} VERBATIM)
    target_sources(${target} PRIVATE ${made}/LC_NUMERIC)
endfunction()
