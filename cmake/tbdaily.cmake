# What every target of the project is built with, and the two kinds of target that a folder declares.
#
# The targets of libraries are called tbdaily_<name>, since the tree may be part of a larger project. DEPENDS names them without
# the prefix.

find_program(TBDAILY_CCACHE ccache)
if(TBDAILY_CCACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
  # Headers that are read once cannot be told apart by their time.
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros ${TBDAILY_CCACHE})
  add_compile_options($<$<COMPILE_LANG_AND_ID:CXX,GNU>:-fpch-preprocess>)
endif()

add_library(tbdaily_options INTERFACE)
target_compile_options(tbdaily_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wold-style-cast -Wnon-virtual-dtor -Woverloaded-virtual
  # A figure has the same last digit on every processor: multiplying and adding stay two operations.
  -ffp-contract=off
  -Wformat=2 -Wcast-align -Wundef $<$<BOOL:${TBDAILY_WERROR}>:-Werror>)
# When it optimises, g++ 12 sees overflows in the standard library's own strings and copies. Other builds keep these warnings, and so do
# other compilers.
target_compile_options(tbdaily_options INTERFACE
  $<$<AND:$<CONFIG:Release>,$<COMPILE_LANG_AND_ID:CXX,GNU>>:-Wno-array-bounds -Wno-restrict -Wno-stringop-overflow -Wno-stringop-overread>)
target_include_directories(tbdaily_options INTERFACE ${PROJECT_SOURCE_DIR})
if(TBDAILY_SANITIZE)
  add_compile_options(-fsanitize=${TBDAILY_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${TBDAILY_SANITIZE})
endif()

include(CheckLinkerFlag)
check_linker_flag(CXX -Wl,-z,pack-relative-relocs TBDAILY_PACKS_RELOCATIONS)
set(TBDAILY_PACKED_RELOCATIONS $<$<BOOL:${TBDAILY_PACKS_RELOCATIONS}>:-Wl,-z,pack-relative-relocs>)

# tbdaily_library(NAME SOURCES ... DEPENDS ... [PRECOMPILES ... | READS_AS NAME]): one folder, one library. DEPENDS says which other
# folders it may include. What nearly every file includes is read once for all libraries; PRECOMPILES adds headers of this
# library's files, READS_AS takes what another library precompiles. Not for clang, which finds the files that forget to include it.
set(tbdaily_read_once <algorithm> <array> <cmath> <functional> <limits> <memory> <optional> <span> <string> <string_view> <utility>
  <vector> ${PROJECT_SOURCE_DIR}/platform/plist_value.h)
function(tbdaily_library name)
  cmake_parse_arguments(ARG "" "READS_AS" "SOURCES;DEPENDS;PRECOMPILES" ${ARGN})
  list(TRANSFORM ARG_DEPENDS PREPEND tbdaily_)
  add_library(tbdaily_${name} STATIC ${ARG_SOURCES})
  # A library of somebody else that links these objects shows none of their names.
  set_target_properties(tbdaily_${name} PROPERTIES CXX_VISIBILITY_PRESET hidden VISIBILITY_INLINES_HIDDEN ON)
  target_link_libraries(tbdaily_${name} PUBLIC ${ARG_DEPENDS} PRIVATE tbdaily_options)
  # Before the folders that a surrounding project gives to all its targets.
  target_include_directories(tbdaily_${name} BEFORE PUBLIC ${PROJECT_SOURCE_DIR})
  if(NOT CMAKE_CXX_COMPILER_ID STREQUAL GNU)
    return()
  endif()
  if(ARG_PRECOMPILES OR name STREQUAL platform)
    target_precompile_headers(tbdaily_${name} PRIVATE ${tbdaily_read_once} ${ARG_PRECOMPILES})
  elseif(ARG_READS_AS)
    target_precompile_headers(tbdaily_${name} REUSE_FROM tbdaily_${ARG_READS_AS})
  else()
    target_precompile_headers(tbdaily_${name} REUSE_FROM tbdaily_platform)
  endif()
endfunction()

# tbdaily_program(NAME SOURCES ... DEPENDS ...): a program that starts often and ends soon. The language's own library is part of it:
# looking up that library's names takes longer than the work of a day that is done already.
function(tbdaily_program name)
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  list(TRANSFORM ARG_DEPENDS PREPEND tbdaily_)
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE ${ARG_DEPENDS} tbdaily_options)
  tbdaily_include_runtime(${name})
endfunction()

function(tbdaily_include_runtime target)
  if(CMAKE_BUILD_TYPE STREQUAL Release AND NOT TBDAILY_SANITIZE)
    target_link_options(${target} PRIVATE -static-libstdc++ -static-libgcc -Wl,--gc-sections ${TBDAILY_PACKED_RELOCATIONS})
  endif()
endfunction()

# tbdaily_test(NAME SOURCES ... DEPENDS ...): a unit-test program that links the library under test, those below it, the fakes
# where it names them, and nothing else.
function(tbdaily_test name)
  if(NOT TBDAILY_TESTS)
    return()
  endif()
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  list(TRANSFORM ARG_DEPENDS PREPEND tbdaily_)
  find_package(GTest REQUIRED)
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE ${ARG_DEPENDS} GTest::gmock GTest::gtest_main tbdaily_options)
  # The fakes and the test framework are read once; fakes_contract_test has made them ready.
  if(CMAKE_CXX_COMPILER_ID STREQUAL GNU AND "tbdaily_testing" IN_LIST ARG_DEPENDS)
    if(TARGET fakes_contract_test AND NOT name STREQUAL fakes_contract_test)
      target_precompile_headers(${name} REUSE_FROM fakes_contract_test)
    else()
      target_precompile_headers(${name} PRIVATE <gmock/gmock.h> <testing/fake_platform.h>)
    endif()
  endif()
  add_test(NAME ${name} COMMAND ${name})
  set_tests_properties(${name} PROPERTIES TIMEOUT 300)
endfunction()
