# Install rules, the CMake package (find_package(vamrnb) gives vamrnb::vamrnb
# and vamrnb::vamrnb_static) and the pkg-config file vamrnb.pc.
include(CMakePackageConfigHelpers)

set(VAMRNB_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/vamrnb)

set_target_properties(vamrnb PROPERTIES EXPORT_NAME vamrnb)
set_target_properties(vamrnb_static PROPERTIES EXPORT_NAME vamrnb_static)

install(TARGETS vamrnb vamrnb_static EXPORT vamrnbTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
file(GLOB VAMRNB_PUBLIC_HEADERS CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/include/*.h)
install(FILES ${VAMRNB_PUBLIC_HEADERS}
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})

install(EXPORT vamrnbTargets NAMESPACE vamrnb::
  FILE vamrnbTargets.cmake DESTINATION ${VAMRNB_CMAKE_DIR})
configure_package_config_file(
  ${CMAKE_CURRENT_LIST_DIR}/vamrnbConfig.cmake.in
  ${PROJECT_BINARY_DIR}/vamrnbConfig.cmake
  INSTALL_DESTINATION ${VAMRNB_CMAKE_DIR})
write_basic_package_version_file(
  ${PROJECT_BINARY_DIR}/vamrnbConfigVersion.cmake
  VERSION ${PROJECT_VERSION} COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/vamrnbConfig.cmake
              ${PROJECT_BINARY_DIR}/vamrnbConfigVersion.cmake
  DESTINATION ${VAMRNB_CMAKE_DIR})

# pkg-config: the prefix is derived from the .pc file's own location so that
# an installed tree can be moved (or installed with --prefix at install time).
set(VAMRNB_PC_DIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
file(RELATIVE_PATH VAMRNB_PC_TO_PREFIX
     /prefix/${VAMRNB_PC_DIR} /prefix)
string(REGEX REPLACE "/$" "" VAMRNB_PC_TO_PREFIX "${VAMRNB_PC_TO_PREFIX}")
if(IS_ABSOLUTE ${CMAKE_INSTALL_LIBDIR} OR IS_ABSOLUTE ${CMAKE_INSTALL_INCLUDEDIR})
  set(VAMRNB_PC_PREFIX ${CMAKE_INSTALL_PREFIX})
else()
  set(VAMRNB_PC_PREFIX "\${pcfiledir}/${VAMRNB_PC_TO_PREFIX}")
endif()
configure_file(${CMAKE_CURRENT_LIST_DIR}/vamrnb.pc.in
               ${PROJECT_BINARY_DIR}/vamrnb.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/vamrnb.pc DESTINATION ${VAMRNB_PC_DIR})
