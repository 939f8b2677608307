# The target "verify": every header compiles on its own, and every source compiles without the
# precompiled header of its target. Nothing is linked, and no code is generated.
#
# Only what a precompiled header could hide is compiled here. The sources of the plug-in and the
# platform have none, so the build itself checks them; it also checks a header that the source beside
# it includes first.
#
# The headers of GoogleTest and of the JSON library take longer to read than most files that include
# them. Such a file gets that header precompiled, which hides nothing that the file does not include
# itself. The files are sorted at configure time; run cmake before the target when includes of these
# headers changed.
add_custom_target(verify)

# zav_verify(<name> LIBRARIES <lib>... [DEFINITIONS <definition>...]
#            [SOURCES <file>...] [ROOT <folder> HEADERS <file>...])
#
# Adds files to the target "verify". They are compiled as users of the libraries are, and headers are
# included by their path below `ROOT`.
function(zav_verify name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "ROOT" "LIBRARIES;DEFINITIONS;SOURCES;HEADERS")
  foreach(file ${arg_SOURCES})
    zav_slow_headers_of(kind ${file})
    list(APPEND ${kind}_files ${file})
  endforeach()
  foreach(header ${arg_HEADERS})
    file(RELATIVE_PATH path ${arg_ROOT} ${header})
    zav_checked_by_its_source(checked ${header} ${path})
    if(checked)
      continue()
    endif()
    zav_slow_headers_of(kind ${header})
    set(source ${CMAKE_BINARY_DIR}/verify/${name}/${path}.cpp)
    file(CONFIGURE OUTPUT ${source} CONTENT "#include \"${path}\"\n")
    list(APPEND ${kind}_files ${source})
  endforeach()

  foreach(kind none gtest gmock json gtest_json gmock_json)
    if(NOT ${kind}_files)
      continue()
    endif()
    set(target verify_${name}_${kind})
    add_library(${target} OBJECT EXCLUDE_FROM_ALL ${${kind}_files})
    set_target_properties(${target} PROPERTIES
      CXX_COMPILER_LAUNCHER ${CMAKE_SOURCE_DIR}/cmake/syntax-only.sh EXPORT_COMPILE_COMMANDS OFF)
    target_link_libraries(${target} PRIVATE ${arg_LIBRARIES} zav_options)
    target_compile_definitions(${target} PRIVATE ${arg_DEFINITIONS})
    target_compile_options(${target} PRIVATE -O0 -g0)
    if(kind MATCHES "gtest|gmock")
      target_precompile_headers(${target} PRIVATE <${CMAKE_MATCH_0}/${CMAKE_MATCH_0}.h>)
    endif()
    if(kind MATCHES "json")
      target_precompile_headers(${target} PRIVATE <nlohmann/json.hpp>)
    endif()
    add_dependencies(verify ${target})
  endforeach()
endfunction()

# Sets `variable` to gmock or gtest, json, both with a "_" between them, or none: the slow headers that
# the file includes. That of gmock brings gtest's.
function(zav_slow_headers_of variable file)
  file(STRINGS ${file} lines REGEX "^#include <(g(mock|test)/g(mock|test)\\.h|nlohmann/json\\.hpp)>")
  set(kinds "")
  if(lines MATCHES "gmock")
    list(APPEND kinds gmock)
  elseif(lines MATCHES "gtest")
    list(APPEND kinds gtest)
  endif()
  if(lines MATCHES "nlohmann")
    list(APPEND kinds json)
  endif()
  if(NOT kinds)
    set(kinds none)
  endif()
  list(JOIN kinds "_" kind)
  set(${variable} ${kind} PARENT_SCOPE)
endfunction()

# Sets `variable` to whether the source beside a header includes it first.
function(zav_checked_by_its_source variable header path)
  set(${variable} FALSE PARENT_SCOPE)
  string(REGEX REPLACE "\\.h$" ".cpp" source ${header})
  if(EXISTS ${source})
    file(STRINGS ${source} first REGEX "^#include" LIMIT_COUNT 1)
    if(first STREQUAL "#include \"${path}\"")
      set(${variable} TRUE PARENT_SCOPE)
    endif()
  endif()
endfunction()

file(GLOB_RECURSE headers plugin/*.h)
zav_verify(plugin LIBRARIES zavmgmt_objects ROOT ${CMAKE_SOURCE_DIR}/plugin HEADERS ${headers})

set(libraries zavplatform zavplatform_internals zav_expat)
file(GLOB_RECURSE headers platform/include/*.h)
zav_verify(seam LIBRARIES ${libraries} ROOT ${CMAKE_SOURCE_DIR}/platform/include HEADERS ${headers})
file(GLOB_RECURSE headers platform/embedded/*.h)
zav_verify(embedded LIBRARIES ${libraries} ROOT ${CMAKE_SOURCE_DIR}/platform/embedded
  HEADERS ${headers})
file(GLOB_RECURSE headers platform/conformance/*.h)
zav_verify(conformance LIBRARIES ${libraries} ROOT ${CMAKE_SOURCE_DIR}/platform HEADERS ${headers})

foreach(program host ctl)
  file(GLOB_RECURSE sources ${program}/*.cpp)
  file(GLOB_RECURSE headers ${program}/*.h)
  list(FILTER sources EXCLUDE REGEX "/ctl/console/")
  list(FILTER headers EXCLUDE REGEX "/ctl/console/")
  zav_verify(${program} LIBRARIES zav${program}_core
    DEFINITIONS $<TARGET_PROPERTY:zav${program}_core,COMPILE_DEFINITIONS>
    SOURCES ${sources} ROOT ${CMAKE_SOURCE_DIR} HEADERS ${headers})
endforeach()

if(TARGET zavctl_console)
  file(GLOB_RECURSE sources ctl/console/*.cpp)
  file(GLOB_RECURSE headers ctl/console/*.h)
  zav_verify(console LIBRARIES zavctl_console
    DEFINITIONS $<TARGET_PROPERTY:zavctl_console,COMPILE_DEFINITIONS>
    SOURCES ${sources} ROOT ${CMAKE_SOURCE_DIR} HEADERS ${headers})
endif()

# What several programs share.
file(GLOB_RECURSE sources http/*.cpp metrics/*.cpp routes/*.cpp sqlite/*.cpp text/*.cpp)
file(GLOB_RECURSE headers http/*.h metrics/*.h routes/*.h secrets/*.h sqlite/*.h system/*.h text/*.h)
zav_verify(shared LIBRARIES zav_routes zav_http zav_text zav_metrics zav_database
  DEFINITIONS $<TARGET_PROPERTY:zav_http,COMPILE_DEFINITIONS>
  SOURCES ${sources} ROOT ${CMAKE_SOURCE_DIR} HEADERS ${headers})

set(fleet_libraries "")
if(TARGET zavfleet_bus)
  set(fleet_libraries zavfleet_bus zavfleet_https zav_nats zav_sodium)
  file(GLOB_RECURSE sources fleet/*.cpp)
  file(GLOB_RECURSE headers fleet/*.h)
  zav_verify(fleet LIBRARIES ${fleet_libraries} zavctl_console zav_database
    DEFINITIONS ZAV_VERSION="${PROJECT_VERSION}" $<TARGET_PROPERTY:zav_http,COMPILE_DEFINITIONS>
    SOURCES ${sources} ROOT ${CMAKE_SOURCE_DIR} HEADERS ${headers})
endif()

if(ZAV_BUILD_TESTS)
  file(GLOB_RECURSE sources tests/*.cpp)
  file(GLOB_RECURSE headers tests/*.h)
  # These are built without precompiled headers, by builds of their own.
  list(FILTER sources EXCLUDE REGEX "/tests/(fuzz|install/consumer)/")
  list(FILTER headers EXCLUDE REGEX "/tests/(fuzz|install/consumer)/")
  if(NOT fleet_libraries)
    list(FILTER sources EXCLUDE REGEX "/tests/fleet/")
    list(FILTER headers EXCLUDE REGEX "/tests/fleet/")
  endif()
  zav_verify(tests LIBRARIES ${fleet_libraries} zav_test_support zavhost_core zavctl_core zavconformance_objects
    DEFINITIONS ZAV_EXAMPLE_DIR="" # of one test only
    SOURCES ${sources} ROOT ${CMAKE_SOURCE_DIR}/tests HEADERS ${headers})
endif()
