# Target zav_sqlite: the database library for this build's width, as cmake/expat.cmake does it.
add_library(zav_sqlite INTERFACE)
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
  find_library(ZAV_SQLITE_I386 libsqlite3.a
    PATHS ${ZAV_I386_ROOT}/usr/lib/i386-linux-gnu NO_DEFAULT_PATH)
  if(NOT ZAV_SQLITE_I386)
    message(FATAL_ERROR "No 32-bit SQLite below ${ZAV_I386_ROOT}: run scripts/bootstrap.sh")
  endif()
  find_package(Threads REQUIRED)
  target_include_directories(zav_sqlite SYSTEM INTERFACE ${ZAV_I386_ROOT}/usr/include)
  target_link_libraries(zav_sqlite INTERFACE ${ZAV_SQLITE_I386} Threads::Threads ${CMAKE_DL_LIBS} m)
else()
  # The first version with the statements that the journal uses.
  find_package(SQLite3 3.35 REQUIRED)
  target_link_libraries(zav_sqlite INTERFACE SQLite::SQLite3)
endif()
