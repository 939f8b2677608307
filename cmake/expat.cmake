# Target zav_expat: the XML parser for this build's width.
#
# The 32-bit development package cannot be installed beside the 64-bit one, so for i686
# scripts/bootstrap.sh unpacks it into build/third_party/i386 and it is linked statically.
add_library(zav_expat INTERFACE)
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
  set(ZAV_I386_ROOT ${CMAKE_SOURCE_DIR}/build/third_party/i386 CACHE PATH
      "Folder with the unpacked 32-bit packages")
  find_library(ZAV_EXPAT_I386 libexpat.a
    PATHS ${ZAV_I386_ROOT}/usr/lib/i386-linux-gnu NO_DEFAULT_PATH)
  if(NOT ZAV_EXPAT_I386)
    message(FATAL_ERROR "No 32-bit expat below ${ZAV_I386_ROOT}: run scripts/bootstrap.sh")
  endif()
  target_include_directories(zav_expat SYSTEM INTERFACE ${ZAV_I386_ROOT}/usr/include
    ${ZAV_I386_ROOT}/usr/include/i386-linux-gnu)
  target_link_libraries(zav_expat INTERFACE ${ZAV_EXPAT_I386})
else()
  # The first version that bounds what entities expand to.
  find_package(EXPAT 2.4 REQUIRED)
  target_link_libraries(zav_expat INTERFACE EXPAT::EXPAT)
endif()
