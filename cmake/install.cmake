# Install the three shared objects, their headers, pkg-config files and a
# CMake package that provides zvutil::zvutil.
include(CMakePackageConfigHelpers)

install(TARGETS zvutil zverrortrace zvlog EXPORT zvutilTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  PUBLIC_HEADER DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/zvutil
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})

# The .pc files find their prefix from where they lie, so --prefix at install
# time is honoured.
set(ZV_PKGCONFIG_DIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
file(RELATIVE_PATH ZV_PC_TO_PREFIX /root/${ZV_PKGCONFIG_DIR} /root)
foreach(pc zvutil zverrortrace zvlog)
  configure_file(${PROJECT_SOURCE_DIR}/cmake/${pc}.pc.in ${PROJECT_BINARY_DIR}/${pc}.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/${pc}.pc DESTINATION ${ZV_PKGCONFIG_DIR})
endforeach()

set(ZV_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/zvutil)
install(EXPORT zvutilTargets NAMESPACE zvutil:: DESTINATION ${ZV_CMAKE_DIR})
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/zvutilConfig.cmake.in
  ${PROJECT_BINARY_DIR}/zvutilConfig.cmake INSTALL_DESTINATION ${ZV_CMAKE_DIR})
write_basic_package_version_file(${PROJECT_BINARY_DIR}/zvutilConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/zvutilConfig.cmake
              ${PROJECT_BINARY_DIR}/zvutilConfigVersion.cmake
  DESTINATION ${ZV_CMAKE_DIR})
