# The installed package: headers, library, find_package(teiseigatro), pkg-config.
include(CMakePackageConfigHelpers)

install(TARGETS teiseigatro EXPORT teiseigatroTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/appindex DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})

set(TEISEIGATRO_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/teiseigatro)
install(EXPORT teiseigatroTargets NAMESPACE teiseigatro:: DESTINATION ${TEISEIGATRO_CMAKE_DIR})
configure_package_config_file(
  ${PROJECT_SOURCE_DIR}/cmake/teiseigatroConfig.cmake.in
  ${PROJECT_BINARY_DIR}/teiseigatroConfig.cmake
  INSTALL_DESTINATION ${TEISEIGATRO_CMAKE_DIR})
write_basic_package_version_file(
  ${PROJECT_BINARY_DIR}/teiseigatroConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES
  ${PROJECT_BINARY_DIR}/teiseigatroConfig.cmake
  ${PROJECT_BINARY_DIR}/teiseigatroConfigVersion.cmake
  DESTINATION ${TEISEIGATRO_CMAKE_DIR})

# Relative to the file itself, so that `cmake --install --prefix` may choose another prefix.
file(RELATIVE_PATH TEISEIGATRO_PC_TO_PREFIX "/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/")
configure_file(${PROJECT_SOURCE_DIR}/cmake/teiseigatro.pc.in
               ${PROJECT_BINARY_DIR}/teiseigatro.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/teiseigatro.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

add_subdirectory(man)
if(TEISEIGATRO_DEVICE STREQUAL "host")  # whose daemon and command these are about
  add_subdirectory(completions)
  add_subdirectory(systemd)
endif()

# What editors and other validators read of descriptors.
install(FILES ${PROJECT_SOURCE_DIR}/schema/index.conf.schema.json
        DESTINATION ${CMAKE_INSTALL_DATADIR}/teiseigatro)
