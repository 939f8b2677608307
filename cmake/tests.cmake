# How the folders below tests/ declare their tests.
include(GoogleTest)

# zav_add_tests([LIBRARIES <lib>...] [DEPENDS <target>...] [LABEL <label>] [COST <n>]
#               [ALONE <file>...])
#
# Makes test programs of all *_test.cpp in the current folder. Every case is a ctest of its own, named
# <folder>.<suite>.<case>, and so runs in a process of its own: the library keeps process-wide state.
#
# A file whose first lines hold "// ctest-label: <label>" gets that label, any other one "unit".
# The label "threaded" marks tests that start threads; the thread sanitizer runs these only. Tests
# labelled "timing" measure time and run alone. All files with one label make one program,
# <folder>_tests or <folder>_<label>_tests. <folder> is the path below tests/, with "_" for "/".
#
#   LIBRARIES  linked besides the test support
#   DEPENDS    targets that the tests run or load
#   LABEL      the ctest label of all cases here, in place of the files' own
#   COST       ctest begins with the most expensive cases; 1 if not given
#   ALONE      files that replace functions of the C library, the platform or the plug-in, or
#              operator new, and those that need another locale than the rest. Each of them is a
#              program of its own, named <folder>_<file>.
function(zav_add_tests)
  cmake_parse_arguments(PARSE_ARGV 0 arg "" "LABEL;COST" "LIBRARIES;DEPENDS;ALONE")
  if(arg_UNPARSED_ARGUMENTS)
    message(FATAL_ERROR "zav_add_tests: what is ${arg_UNPARSED_ARGUMENTS}?")
  endif()
  file(RELATIVE_PATH folder ${CMAKE_SOURCE_DIR}/tests ${CMAKE_CURRENT_SOURCE_DIR})
  string(REPLACE "/" "_" folder ${folder})
  file(GLOB sources CONFIGURE_DEPENDS RELATIVE ${CMAKE_CURRENT_SOURCE_DIR} *_test.cpp)
  foreach(file ${arg_ALONE})
    if(NOT file IN_LIST sources)
      message(FATAL_ERROR "${CMAKE_CURRENT_SOURCE_DIR}/CMakeLists.txt: there is no ${file}")
    endif()
  endforeach()

  set(programs "")
  foreach(source ${sources})
    zav_read_test_label(label ${source})
    if(ZAV_TEST_LABEL AND NOT label STREQUAL ZAV_TEST_LABEL)
      continue()
    endif()
    if(source IN_LIST arg_ALONE)
      get_filename_component(name ${source} NAME_WE)
      set(program ${folder}_${name})
    elseif(label STREQUAL "unit")
      set(program ${folder}_tests)
    else()
      set(program ${folder}_${label}_tests)
    endif()
    list(APPEND programs ${program})
    list(APPEND ${program}_sources ${source})
    set(${program}_label ${label})
  endforeach()

  list(REMOVE_DUPLICATES programs)
  foreach(program ${programs})
    add_executable(${program} ${${program}_sources})
    zav_choose_test_support(support ${${program}_sources})
    target_link_libraries(${program} PRIVATE ${arg_LIBRARIES} ${support} GTest::gtest_main)
    target_precompile_headers(${program} REUSE_FROM ${support})
    foreach(target ${arg_DEPENDS})
      add_dependencies(${program} ${target})
    endforeach()
    set(label ${${program}_label})
    set(properties "")
    if(label STREQUAL "timing")
      list(APPEND properties RUN_SERIAL ON)
    endif()
    if(arg_LABEL)
      set(label ${arg_LABEL})  # one label only: discovery tears a list of them apart
    endif()
    if(arg_COST)
      list(APPEND properties COST ${arg_COST})
    endif()
    # Without the values of parameters, some of which hold addresses: a case keeps its name.
    gtest_discover_tests(${program} DISCOVERY_MODE PRE_TEST TEST_PREFIX ${folder}. NO_PRETTY_VALUES
      PROPERTIES LABELS ${label} ${properties})
  endforeach()
endfunction()

# Sets `variable` to the library whose precompiled header suits these sources: the one with JSON costs
# half a second more where it is not needed, and saves a second and more where it is.
function(zav_choose_test_support variable)
  set(with 0)
  foreach(source ${ARGN})
    file(STRINGS ${source} line REGEX "^#include <nlohmann/" LIMIT_COUNT 1)
    if(line)
      math(EXPR with "${with} + 1")
    endif()
  endforeach()
  list(LENGTH ARGN all)
  math(EXPR thrice "3 * ${with}")
  if(thrice GREATER_EQUAL all)
    set(${variable} zav_test_json PARENT_SCOPE)
  else()
    set(${variable} zav_test_support PARENT_SCOPE)
  endif()
endfunction()

# Sets `variable` to the label that a test's source gives itself.
function(zav_read_test_label variable source)
  file(STRINGS ${source} line REGEX "^// ctest-label: " LIMIT_COUNT 1)
  string(REPLACE "// ctest-label: " "" label "${line}")
  if(NOT label)
    set(label unit)
  endif()
  set(${variable} ${label} PARENT_SCOPE)
endfunction()
