include(CMakePackageConfigHelpers)

set(RKM_CONFIG_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/RKMRezazizuviVaveverodiz)

install(TARGETS RKMRezazizuviVaveverodiz
  EXPORT RKMRezazizuviVaveverodizTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})

file(GLOB RKM_INSTALLED_HEADERS CONFIGURE_DEPENDS
  ${PROJECT_SOURCE_DIR}/ProtectedInterfaces/*/*.h
  ${PROJECT_SOURCE_DIR}/SystemInterfaces/*.h)
install(FILES ${RKM_INSTALLED_HEADERS}
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/RKMRezazizuviVaveverodiz)

install(EXPORT RKMRezazizuviVaveverodizTargets
  NAMESPACE RKMRezazizuviVaveverodiz::
  DESTINATION ${RKM_CONFIG_DIR})

configure_package_config_file(
  ${PROJECT_SOURCE_DIR}/cmake/RKMRezazizuviVaveverodizConfig.cmake.in
  ${PROJECT_BINARY_DIR}/RKMRezazizuviVaveverodizConfig.cmake
  INSTALL_DESTINATION ${RKM_CONFIG_DIR})
write_basic_package_version_file(
  ${PROJECT_BINARY_DIR}/RKMRezazizuviVaveverodizConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES
  ${PROJECT_BINARY_DIR}/RKMRezazizuviVaveverodizConfig.cmake
  ${PROJECT_BINARY_DIR}/RKMRezazizuviVaveverodizConfigVersion.cmake
  DESTINATION ${RKM_CONFIG_DIR})
