# Read by cpack for each kind of package: what Debian alone asks for goes into its package alone.
if(CPACK_GENERATOR STREQUAL "DEB")
  list(GET CPACK_INSTALL_CMAKE_PROJECTS 0 build)
  list(APPEND CPACK_INSTALL_CMAKE_PROJECTS ${build} tolkwd debian /)
endif()
