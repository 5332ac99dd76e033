# Read by cpack for each kind of package.
if(CPACK_GENERATOR STREQUAL "TGZ")
  # Relocatable, with the libraries that it needs, and therefore without MPI, which must be that of the cluster.
  set(CPACK_MONOLITHIC_INSTALL ON)
  list(GET CPACK_INSTALL_CMAKE_PROJECTS 0 build)
  set(CPACK_INSTALL_CMAKE_PROJECTS "${build};Mirevo;program;/")
  set(CPACK_PACKAGING_INSTALL_PREFIX "/")
endif()
