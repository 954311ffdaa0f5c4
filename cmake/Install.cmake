# What is installed, in components, which `cmake --install --component` can leave out:
#   runtime      the shared library
#   development  its headers, find_package(teiseigatro), pkg-config, its manual page
#   tools        the command appindex and its units, the formats of files, completions, the schema
#   daemon       tovoelasticd and its units
#   host_sdk     what a port to another device starts from: the contracts, and the host's parts
include(CMakePackageConfigHelpers)

install(TARGETS teiseigatro EXPORT teiseigatroTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  COMPONENT runtime NAMELINK_COMPONENT development)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/appindex DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
        COMPONENT development)

set(TEISEIGATRO_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/teiseigatro)
install(EXPORT teiseigatroTargets NAMESPACE teiseigatro:: DESTINATION ${TEISEIGATRO_CMAKE_DIR}
        COMPONENT development)
configure_package_config_file(
  ${PROJECT_SOURCE_DIR}/cmake/teiseigatroConfig.cmake.in
  ${PROJECT_BINARY_DIR}/teiseigatroConfig.cmake
  INSTALL_DESTINATION ${TEISEIGATRO_CMAKE_DIR})
write_basic_package_version_file(
  ${PROJECT_BINARY_DIR}/teiseigatroConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES
  ${PROJECT_BINARY_DIR}/teiseigatroConfig.cmake
  ${PROJECT_BINARY_DIR}/teiseigatroConfigVersion.cmake
  DESTINATION ${TEISEIGATRO_CMAKE_DIR} COMPONENT development)

# Relative to the file itself, so that `cmake --install --prefix` may choose another prefix.
file(RELATIVE_PATH TEISEIGATRO_PC_TO_PREFIX "/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/")
configure_file(${PROJECT_SOURCE_DIR}/cmake/teiseigatro.pc.in
               ${PROJECT_BINARY_DIR}/teiseigatro.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/teiseigatro.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig
        COMPONENT development)

add_subdirectory(man)
if(TEISEIGATRO_DEVICE STREQUAL "host")  # whose daemon and command these are about
  add_subdirectory(completions)
  add_subdirectory(systemd)

  # Their includes begin with "device/" and "host/", as they do here.
  set(TEISEIGATRO_SDK_INCLUDEDIR ${CMAKE_INSTALL_INCLUDEDIR}/teiseigatro)
  install(DIRECTORY ${PROJECT_SOURCE_DIR}/device DESTINATION ${TEISEIGATRO_SDK_INCLUDEDIR}
          COMPONENT host_sdk)
  install(FILES ${PROJECT_SOURCE_DIR}/host/device_root.h ${PROJECT_SOURCE_DIR}/host/framing.h
          DESTINATION ${TEISEIGATRO_SDK_INCLUDEDIR}/host COMPONENT host_sdk)
  set_target_properties(teiseigatro_host PROPERTIES EXPORT_NAME host)
  set_target_properties(teiseigatro_host_sdk PROPERTIES EXPORT_NAME host_sdk)
  install(TARGETS teiseigatro_host teiseigatro_host_sdk EXPORT teiseigatroHostSdkTargets
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT host_sdk
    INCLUDES DESTINATION ${TEISEIGATRO_SDK_INCLUDEDIR})
  install(EXPORT teiseigatroHostSdkTargets NAMESPACE teiseigatro::
          DESTINATION ${TEISEIGATRO_CMAKE_DIR} COMPONENT host_sdk)
endif()

# What editors and other validators read of descriptors.
install(FILES ${PROJECT_SOURCE_DIR}/schema/index.conf.schema.json
        DESTINATION ${CMAKE_INSTALL_DATADIR}/teiseigatro COMPONENT tools)
