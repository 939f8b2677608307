# Compiler settings that every target of this project shares.
find_package(Threads REQUIRED)

find_program(CCACHE ccache)
if(CCACHE)
  # Precompiled headers and several checkouts side by side need these two relaxations.
  set(CMAKE_CXX_COMPILER_LAUNCHER
      ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime
      CCACHE_NOHASHDIR=1 CCACHE_BASEDIR=${CMAKE_SOURCE_DIR} ${CCACHE})
endif()

add_library(zav_options INTERFACE)
target_compile_options(zav_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wnon-virtual-dtor
  -Woverloaded-virtual -Wcast-align
  $<$<BOOL:${ZAV_WARNINGS_AS_ERRORS}>:-Werror>
  # Locks and what they guard are marked for clang alone, which builds the fuzz targets.
  $<$<CXX_COMPILER_ID:Clang>:-Wthread-safety -Werror=thread-safety>
  # Only its header is wanted from a precompiled header, not its debug info in every object.
  $<$<CXX_COMPILER_ID:GNU>:-fpch-preprocess>)
# File offsets and times are 64 bits wide on 32-bit Linux too.
target_compile_definitions(zav_options INTERFACE _FILE_OFFSET_BITS=64)
target_link_libraries(zav_options INTERFACE Threads::Threads)
if(CMAKE_CXX_FLAGS MATCHES "-fsanitize" AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
  # Instrumented code trips the flow analysis behind this warning.
  target_compile_options(zav_options INTERFACE -Wno-maybe-uninitialized)
endif()

# zav_unity_build(<target>): compiles several sources of a target at once. Most of what the programs'
# sources cost is templates of the same few libraries, which is paid once for all of them. Sources
# share what has no linkage then, so names there must differ; the target "verify" compiles each alone.
function(zav_unity_build target)
  set_target_properties(${target} PROPERTIES
    UNITY_BUILD ${ZAV_UNITY_BUILD} UNITY_BUILD_BATCH_SIZE 8)
endfunction()

# For what is shipped. Sanitizers look for the same faults themselves, and counting of
# lines wants code as it is written.
add_library(zav_hardening INTERFACE)
set(ZAV_HARDENED ON)
if(CMAKE_CXX_FLAGS MATCHES "-fsanitize" OR ZAV_COVERAGE)
  set(ZAV_HARDENED OFF)
endif()
if(ZAV_HARDENED)
  # Programs are linked as position independent, too, whatever the compiler's default is.
  include(CheckPIESupported)
  check_pie_supported(LANGUAGES CXX)
  include(CheckCXXCompilerFlag)
  check_cxx_compiler_flag(-fcf-protection ZAV_HAS_CF_PROTECTION)  # x86 only
  target_compile_options(zav_hardening INTERFACE -fstack-protector-strong
    $<$<BOOL:${ZAV_HAS_CF_PROTECTION}>:-fcf-protection>
    # Some distributions' compilers define it by themselves. It needs an optimised build.
    $<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-U_FORTIFY_SOURCE>
    $<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-D_FORTIFY_SOURCE=3>
    # With the checked functions GCC 12 sees overlaps and overruns in inlined strings where there are none.
    $<$<CXX_COMPILER_ID:GNU>:-Wno-array-bounds> $<$<CXX_COMPILER_ID:GNU>:-Wno-restrict>)
  target_compile_definitions(zav_hardening INTERFACE _GLIBCXX_ASSERTIONS)
  target_link_options(zav_hardening INTERFACE LINKER:-z,relro LINKER:-z,now)
endif()
