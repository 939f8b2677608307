# What `cmake --install` lays out beside the programs: headers, the CMake package and zavmgmt.pc.
# Headers live in a folder of their own, because names such as base/ and platform/ are anybody's;
# the package and the .pc file put that folder on the include path.
#
# Each install() names its COMPONENT, which is the name of the Debian package that the files belong to.
set(ZAV_INSTALL_HEADERS ${CMAKE_INSTALL_INCLUDEDIR}/zavmgmt)
set(ZAV_PACKAGE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/zavmgmt)

# Adds to the list `listVar` of headers below `root` those that they include, directly or not.
function(zav_header_closure listVar root)
  set(known)
  set(open ${${listVar}})
  while(open)
    list(POP_FRONT open header)
    if(header IN_LIST known OR NOT EXISTS ${root}/${header})
      continue()
    endif()
    list(APPEND known ${header})
    # An include that comes or goes changes what is installed.
    set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${root}/${header})
    file(STRINGS ${root}/${header} includes REGEX "^#include \"")
    list(TRANSFORM includes REPLACE "^#include \"([^\"]+)\".*" "\\1")
    list(APPEND open ${includes})
  endwhile()
  set(${listVar} ${known} PARENT_SCOPE)
endfunction()

# Called once every target that is exported exists.
function(zav_install_package)
  include(CMakePackageConfigHelpers)
  configure_package_config_file(cmake/zavmgmtConfig.cmake.in
    ${CMAKE_BINARY_DIR}/package/zavmgmtConfig.cmake INSTALL_DESTINATION ${ZAV_PACKAGE_DIR})
  write_basic_package_version_file(${CMAKE_BINARY_DIR}/package/zavmgmtConfigVersion.cmake
    COMPATIBILITY SameMajorVersion)
  install(FILES ${CMAKE_BINARY_DIR}/package/zavmgmtConfig.cmake
    ${CMAKE_BINARY_DIR}/package/zavmgmtConfigVersion.cmake DESTINATION ${ZAV_PACKAGE_DIR}
    COMPONENT zavmgmt-dev)
  install(EXPORT zavmgmt NAMESPACE zavmgmt:: FILE zavmgmtTargets.cmake
    DESTINATION ${ZAV_PACKAGE_DIR} COMPONENT zavmgmt-dev)

  # The way from the .pc file to the prefix keeps the installation relocatable.
  cmake_path(SET pc_dir NORMALIZE ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig)
  cmake_path(RELATIVE_PATH CMAKE_INSTALL_PREFIX BASE_DIRECTORY ${pc_dir}
    OUTPUT_VARIABLE ZAV_PREFIX_FROM_PC)
  configure_file(cmake/zavmgmt.pc.in ${CMAKE_BINARY_DIR}/package/zavmgmt.pc @ONLY)
  install(FILES ${CMAKE_BINARY_DIR}/package/zavmgmt.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT zavmgmt-dev)
endfunction()
