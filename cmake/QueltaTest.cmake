# quelta_test(NAME SOURCES file... [LIBS target...] [LABELS label...] [DEFINES macro...]
#             [WRAP function...] [COUNT_ALLOCATIONS])
#
# One GoogleTest program per unit. Each case is discovered and runs in its own process, so cases
# share no state and run in any order and in parallel. The test sees private members
# (-fno-access-control). WRAP lists functions whose calls the linker's --wrap redirects to
# tests/support/ScriptedLibc.h, or to a __wrap_ function that the test defines. COUNT_ALLOCATIONS
# adds the operator new of tests/support/AllocationProbe.h.
find_package(GTest REQUIRED)
include(GoogleTest)

# The programs to run under the thread sanitizer: those labelled thread.
add_custom_target(thread_tests)

# The flags of a test's own sources. Only the CPU-bound oracles are worth optimising; the library
# under test keeps the flags of its preset.
function(quelta_test_flags name optimized)
  target_compile_options(${name} PRIVATE -fno-access-control)
  if(NOT optimized)
    target_compile_options(${name} PRIVATE -O0 -g1)
  endif()
  target_link_libraries(${name} PRIVATE quelta_util GTest::gmock GTest::gtest_main)
  quelta_warnings(${name})
  quelta_sanitize(${name})
endfunction()

# GoogleTest's headers would take half of the time to build the tests, so they are precompiled once
# for each set of flags. The owners are programs because only programs are compiled as
# position-independent executables, like the tests.
foreach(variant quick optimized)
  file(CONFIGURE OUTPUT test_headers_${variant}.cpp CONTENT "")
  add_executable(test_headers_${variant} ${CMAKE_CURRENT_BINARY_DIR}/test_headers_${variant}.cpp)
  target_precompile_headers(test_headers_${variant} PRIVATE
    <gmock/gmock.h> <gtest/gtest.h> <filesystem> <fstream> <map> <memory> <set> <sstream> <string>
    <vector>)
endforeach()
quelta_test_flags(test_headers_quick FALSE)
quelta_test_flags(test_headers_optimized TRUE)

# Not instrumented by a sanitizer; the comment in the source says why.
add_library(scripted_libc OBJECT ${PROJECT_SOURCE_DIR}/tests/support/ScriptedLibc.cpp)
set_property(TARGET scripted_libc PROPERTY POSITION_INDEPENDENT_CODE ON)
target_include_directories(scripted_libc PRIVATE ${PROJECT_SOURCE_DIR}/tests)
target_link_libraries(scripted_libc PRIVATE quelta_util)
quelta_warnings(scripted_libc)

function(quelta_test name)
  cmake_parse_arguments(arg "COUNT_ALLOCATIONS" "TIMEOUT" "SOURCES;LIBS;LABELS;DEFINES;WRAP" ${ARGN})
  add_executable(${name} ${arg_SOURCES})
  target_include_directories(${name} PRIVATE
    ${PROJECT_SOURCE_DIR}/src ${PROJECT_SOURCE_DIR}/tests)
  target_link_libraries(${name} PRIVATE ${arg_LIBS})
  if("oracle" IN_LIST arg_LABELS)
    quelta_test_flags(${name} TRUE)
    target_precompile_headers(${name} REUSE_FROM test_headers_optimized)
  else()
    quelta_test_flags(${name} FALSE)
    target_precompile_headers(${name} REUSE_FROM test_headers_quick)
  endif()
  target_compile_definitions(${name} PRIVATE ${arg_DEFINES})
  if(arg_WRAP)
    list(TRANSFORM arg_WRAP PREPEND -Wl,--wrap=)
    target_link_options(${name} PRIVATE ${arg_WRAP})
    target_sources(${name} PRIVATE $<TARGET_OBJECTS:scripted_libc>)
  endif()
  if(arg_COUNT_ALLOCATIONS)
    target_sources(${name} PRIVATE ${PROJECT_SOURCE_DIR}/tests/support/AllocationProbe.cpp)
  endif()
  if(NOT arg_LABELS)
    set(arg_LABELS unit)
  endif()
  if(NOT arg_TIMEOUT)
    set(arg_TIMEOUT 120)
  endif()
  if("thread" IN_LIST arg_LABELS)
    add_dependencies(thread_tests ${name})
  endif()
  gtest_discover_tests(${name}
    DISCOVERY_TIMEOUT 60
    PROPERTIES TIMEOUT ${arg_TIMEOUT})
  # Set separately, because gtest_discover_tests would split a list of labels.
  set(labels_file "${CMAKE_CURRENT_BINARY_DIR}/${name}_labels.cmake")
  file(WRITE "${labels_file}"
    "foreach(test IN LISTS ${name}_TESTS)\n"
    "  set_tests_properties(\"\${test}\" PROPERTIES LABELS \"${arg_LABELS}\")\n"
    "endforeach()\n")
  set_property(DIRECTORY APPEND PROPERTY TEST_INCLUDE_FILES "${labels_file}")
endfunction()
