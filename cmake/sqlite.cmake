# Target zav_sqlite: the database library for this build's width.
add_library(zav_sqlite INTERFACE)
if(ZAV_LINK_UNPACKED_I386)
  zav_link_i386(zav_sqlite libsqlite3.a)
  find_package(Threads REQUIRED)
  target_link_libraries(zav_sqlite INTERFACE Threads::Threads ${CMAKE_DL_LIBS} m)
else()
  # The first version with the statements that the journal uses.
  find_package(SQLite3 3.35 REQUIRED)
  target_link_libraries(zav_sqlite INTERFACE SQLite::SQLite3)
endif()
