# Installs the library, the embedded host, the headers, and what CMake and pkg-config need to find them.
include(CMakePackageConfigHelpers)

set(vexel_package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/vexel)
set(vexel_targets vexel)
if(VEXEL_HOST STREQUAL "embedded")
  list(APPEND vexel_targets vexelhost)
  set(vexel_pc_host " -lvexelhost")  # a program may use the host's controls, as the CMake target lets it
  install(DIRECTORY ${PROJECT_SOURCE_DIR}/host/include/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
          FILES_MATCHING PATTERN "*.h")
endif()
# The library finds the host beside it, wherever the tree is put.
set_target_properties(${vexel_targets} PROPERTIES INSTALL_RPATH "$ORIGIN")
install(TARGETS ${vexel_targets} EXPORT vexelTargets LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/vexel DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
        FILES_MATCHING PATTERN "*.h")
install(FILES ${PROJECT_BINARY_DIR}/include/vexel/version.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/vexel)

install(EXPORT vexelTargets NAMESPACE vexel:: DESTINATION ${vexel_package_dir})
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/vexelConfig.cmake.in ${PROJECT_BINARY_DIR}/vexelConfig.cmake
                              INSTALL_DESTINATION ${vexel_package_dir} NO_SET_AND_CHECK_MACRO)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/vexelConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/vexelConfig.cmake ${PROJECT_BINARY_DIR}/vexelConfigVersion.cmake
        DESTINATION ${vexel_package_dir})

# Paths relative to the file, so that a tree that was moved or packaged still works.
file(RELATIVE_PATH vexel_pc_prefix /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(${CMAKE_CURRENT_LIST_DIR}/vexel.pc.in ${PROJECT_BINARY_DIR}/vexel.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/vexel.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
