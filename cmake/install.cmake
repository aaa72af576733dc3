# Install the three shared objects, their headers, pkg-config files and a
# CMake package that provides zvutil::zvutil.
#
# Components: each shared object is a component of its own (zvutil,
# zverrortrace, zvlog: the runtime files); everything a program needs to be
# built against them is "development" (headers, the .so links, pkg-config
# files, the CMake package, the manual pages).
include(CMakePackageConfigHelpers)

option(ZV_RELOCATABLE_PKGCONFIG
  "pkg-config files find their prefix from where they lie (OFF: the install prefix, as distributions want)" ON)

foreach(lib zvutil zverrortrace zvlog)
  install(TARGETS ${lib} EXPORT zvutilTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT ${lib}
            NAMELINK_COMPONENT development
    PUBLIC_HEADER DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development
    INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
endforeach()
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/zvutil
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development)

# By default the .pc files find their prefix from where they lie, so --prefix
# at install time is honoured. An absolute libdir or includedir is written as
# it stands, and a .pc file in an absolute libdir names the install prefix.
set(ZV_PKGCONFIG_DIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
if(ZV_RELOCATABLE_PKGCONFIG AND NOT IS_ABSOLUTE "${CMAKE_INSTALL_LIBDIR}")
  file(RELATIVE_PATH ZV_PC_TO_PREFIX /${ZV_PKGCONFIG_DIR} /)
  set(ZV_PC_PREFIX "\${pcfiledir}/${ZV_PC_TO_PREFIX}")
else()
  set(ZV_PC_PREFIX ${CMAKE_INSTALL_PREFIX})
endif()
foreach(dir LIBDIR INCLUDEDIR)
  if(IS_ABSOLUTE "${CMAKE_INSTALL_${dir}}")
    set(ZV_PC_${dir} "${CMAKE_INSTALL_${dir}}")
  else()
    set(ZV_PC_${dir} "\${prefix}/${CMAKE_INSTALL_${dir}}")
  endif()
endforeach()
foreach(pc zvutil zverrortrace zvlog)
  configure_file(${PROJECT_SOURCE_DIR}/cmake/${pc}.pc.in ${PROJECT_BINARY_DIR}/${pc}.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/${pc}.pc DESTINATION ${ZV_PKGCONFIG_DIR}
    COMPONENT development)
endforeach()

set(ZV_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/zvutil)
install(EXPORT zvutilTargets NAMESPACE zvutil:: DESTINATION ${ZV_CMAKE_DIR}
  COMPONENT development)
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/zvutilConfig.cmake.in
  ${PROJECT_BINARY_DIR}/zvutilConfig.cmake INSTALL_DESTINATION ${ZV_CMAKE_DIR})
write_basic_package_version_file(${PROJECT_BINARY_DIR}/zvutilConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/zvutilConfig.cmake
              ${PROJECT_BINARY_DIR}/zvutilConfigVersion.cmake
  DESTINATION ${ZV_CMAKE_DIR} COMPONENT development)
