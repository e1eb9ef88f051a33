# Installs the library, its headers (same paths as in the tree), a CMake
# package and a pkg-config file.
include(CMakePackageConfigHelpers)

install(TARGETS TarnCore TarnPublicObjects EXPORT TarnCoreTargets
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
foreach(header IN LISTS TARN_HEADERS)
  file(RELATIVE_PATH rel ${PROJECT_SOURCE_DIR} ${header})
  if(NOT rel MATCHES "Impl\\.h$")
    get_filename_component(dir ${rel} DIRECTORY)
    install(FILES ${header} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/${dir})
  endif()
endforeach()
install(FILES TarnPublicObjects/TarnPublicObjects.h
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/TarnPublicObjects)

install(EXPORT TarnCoreTargets NAMESPACE Tarn::
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TarnCore)
configure_package_config_file(cmake/TarnCoreConfig.cmake.in
  ${PROJECT_BINARY_DIR}/TarnCoreConfig.cmake
  INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TarnCore)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/TarnCoreConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/TarnCoreConfig.cmake
  ${PROJECT_BINARY_DIR}/TarnCoreConfigVersion.cmake
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TarnCore)

configure_file(cmake/tarncore.pc.in ${PROJECT_BINARY_DIR}/tarncore.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/tarncore.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
