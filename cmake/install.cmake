# Headers, libraries, the pkg-config file and the CMake package.
include(CMakePackageConfigHelpers)

foreach(header IN LISTS TARNWICK_PUBLIC_HEADERS)
  get_filename_component(folder ${header} DIRECTORY)
  install(FILES ${header} DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/tarnwick/${folder})
endforeach()

install(TARGETS tarnwick_shared tarnwick_static EXPORT TarnwickTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})
set(package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/Tarnwick)
install(EXPORT TarnwickTargets NAMESPACE Tarnwick:: DESTINATION ${package_dir})
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/TarnwickConfig.cmake.in
  ${CMAKE_CURRENT_BINARY_DIR}/TarnwickConfig.cmake INSTALL_DESTINATION ${package_dir})
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/TarnwickConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/TarnwickConfig.cmake
              ${CMAKE_CURRENT_BINARY_DIR}/TarnwickConfigVersion.cmake
              ${PROJECT_SOURCE_DIR}/cmake/jsoncpp.cmake
  DESTINATION ${package_dir})

configure_file(${PROJECT_SOURCE_DIR}/cmake/tarnwick.pc.in
  ${CMAKE_CURRENT_BINARY_DIR}/tarnwick.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/tarnwick.pc
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
