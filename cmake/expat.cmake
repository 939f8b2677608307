# Target zav_expat: the XML parser for this build's width.
add_library(zav_expat INTERFACE)
if(ZAV_LINK_UNPACKED_I386)
  zav_link_i386(zav_expat libexpat.a)
else()
  # The first version that bounds what entities expand to.
  find_package(EXPAT 2.4 REQUIRED)
  target_link_libraries(zav_expat INTERFACE EXPAT::EXPAT)
endif()
