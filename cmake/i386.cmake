# Libraries of the distribution for the 32-bit build.
#
# Their development packages cannot be installed beside the 64-bit ones, so scripts/bootstrap.sh unpacks
# them into build/third_party/i386 and they are linked statically.
set(ZAV_I386_ROOT ${CMAKE_SOURCE_DIR}/build/third_party/i386 CACHE PATH
    "Folder with the unpacked 32-bit packages")

# zav_link_i386(<target> <file>): lets the interface library use that static library and its headers.
# <TARGET>_I386 is the library's path.
function(zav_link_i386 target file)
  string(TOUPPER ${target}_I386 library)
  find_library(${library} ${file}
    PATHS ${ZAV_I386_ROOT}/usr/lib/i386-linux-gnu NO_DEFAULT_PATH)
  if(NOT ${library})
    message(FATAL_ERROR "No 32-bit ${file} below ${ZAV_I386_ROOT}: run scripts/bootstrap.sh")
  endif()
  target_include_directories(${target} SYSTEM INTERFACE ${ZAV_I386_ROOT}/usr/include
    ${ZAV_I386_ROOT}/usr/include/i386-linux-gnu)
  target_link_libraries(${target} INTERFACE ${${library}})
endfunction()
