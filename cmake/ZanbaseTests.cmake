# How the programs of tests/ are built: tests with GoogleTest, stress programs, fuzz targets; and the compilers that tests
# run. The paths of their sources are those of the folder that calls.

include(GoogleTest)

# zanbase_test(NAME [ALONE] [FOLDER folder/] [FAKE contract...])
# ALONE runs its tests while no other test runs.
# FAKE leaves out what the back end has for these contracts (`clock` for platform/clock.h): the test's source defines
# their functions itself.
function(zanbase_test name)
    cmake_parse_arguments(arg "ALONE" "FOLDER" "FAKE" ${ARGN})
    set(objects $<TARGET_OBJECTS:zanbase_objects> $<TARGET_OBJECTS:zanbase_texts>)
    foreach(contract IN LISTS arg_FAKE)
        set(objects $<FILTER:${objects},EXCLUDE,/platform/[a-z]+/${contract}\\.cpp>)
    endforeach()
    add_executable(${name} ${arg_FOLDER}${name}.cpp ${objects})
    target_compile_definitions(${name} PRIVATE $<TARGET_PROPERTY:zanbase_objects,INTERFACE_COMPILE_DEFINITIONS>)
    target_include_directories(${name} PRIVATE ${CMAKE_CURRENT_SOURCE_DIR} ${PROJECT_SOURCE_DIR}/src
        $<TARGET_PROPERTY:zanbase_objects,INTERFACE_INCLUDE_DIRECTORIES>)
    target_link_libraries(${name} PRIVATE zanbase_options zanbase_libraries zanbase_test_support
        GTest::gmock GTest::gtest_main Threads::Threads)
    gtest_discover_tests(${name} DISCOVERY_MODE PRE_TEST NO_PRETTY_VALUES PROPERTIES RUN_SERIAL ${arg_ALONE})
endfunction()

# A program that runs long, stress/NAME.cpp. As a test it has its default length.
function(zanbase_stress_test name)
    add_executable(${name} stress/${name}.cpp)
    target_link_libraries(${name} PRIVATE zanbase_options zanbase_objects Threads::Threads)
    target_include_directories(${name} PRIVATE ${CMAKE_CURRENT_SOURCE_DIR})
    add_test(NAME ${name} COMMAND ${name})
    if(CMAKE_CROSSCOMPILING)
        target_compile_definitions(${name} PRIVATE ZANBASE_TEST_EMULATED)
    endif()
endfunction()

# zanbase_fuzz_target(NAME LIBRARY...): fuzz/NAME.cpp for clang's fuzzer, one of those that scripts/fuzz runs.
function(zanbase_fuzz_target name)
    add_executable(${name} EXCLUDE_FROM_ALL fuzz/${name}.cpp)
    target_link_libraries(${name} PRIVATE ${ARGN})
    target_link_options(${name} PRIVATE -fsanitize=fuzzer)
    if(NOT TARGET fuzz_targets)
        add_custom_target(fuzz_targets)
    endif()
    add_dependencies(fuzz_targets ${name})
endfunction()

# Sets `result` to the compilers of programs that use the library or are recorded.
function(zanbase_find_test_compilers result)
    set(compilers)
    foreach(compiler IN ITEMS g++ clang++)
        find_program(ZANBASE_TEST_${compiler} ${compiler})
        if(ZANBASE_TEST_${compiler})
            list(APPEND compilers ${compiler})
        elseif(ZANBASE_BUILD_TESTS STREQUAL AUTO)
            message(STATUS "zanbase: tests with ${compiler} are left out; it is missing")
        else()
            message(FATAL_ERROR "The tests need ${compiler}")
        endif()
    endforeach()
    set(${result} ${compilers} PARENT_SCOPE)
endfunction()

# zanbase_record_test(NAME CASE [COMPILER OPTION...]): a case of record/record_test.sh.
function(zanbase_record_test name)
    add_test(NAME record/${name} COMMAND ${CMAKE_CURRENT_SOURCE_DIR}/record/record_test.sh
        $<TARGET_FILE:zanbase-record> ${ARGN})
endfunction()
