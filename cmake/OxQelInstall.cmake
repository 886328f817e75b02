include(CMakePackageConfigHelpers)

install(TARGETS OxPlatformCore OxClassesDll OxQelDll
  EXPORT OxQelTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/oxqel)

# Public headers keep the source layout, so installed and in-tree includes read the same.
# A part keeps a header out of the package (one that names engine or platform types) with
#   set_property(GLOBAL APPEND PROPERTY OXQEL_PRIVATE_HEADERS ${CMAKE_CURRENT_SOURCE_DIR}/X.h)
get_property(private_headers GLOBAL PROPERTY OXQEL_PRIVATE_HEADERS)
foreach(dir platform/core OxClasses OxQelLib)
  file(GLOB_RECURSE headers RELATIVE ${PROJECT_SOURCE_DIR} ${PROJECT_SOURCE_DIR}/${dir}/*.h)
  foreach(header ${headers})
    if(NOT ${PROJECT_SOURCE_DIR}/${header} IN_LIST private_headers)
      get_filename_component(subdir ${header} DIRECTORY)
      install(FILES ${PROJECT_SOURCE_DIR}/${header} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/oxqel/${subdir})
    endif()
  endforeach()
endforeach()

install(EXPORT OxQelTargets NAMESPACE OxQel:: DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/OxQel)
configure_package_config_file(cmake/OxQelConfig.cmake.in
  ${PROJECT_BINARY_DIR}/OxQelConfig.cmake
  INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/OxQel)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/OxQelConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/OxQelConfig.cmake ${PROJECT_BINARY_DIR}/OxQelConfigVersion.cmake
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/OxQel)

# The .pc file finds its prefix relative to itself (libdir may have one or two levels).
file(RELATIVE_PATH OXQEL_PC_TO_PREFIX "/prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/prefix")
configure_file(cmake/oxqel.pc.in ${PROJECT_BINARY_DIR}/oxqel.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/oxqel.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
