# `cmake --install` gives an application the three static libraries, their
# headers and a package configuration: find_package(mapcore) then links
# mapcore::mapcore, which brings mapcore::http and mapcore::pal and finds
# their Debian dependencies again through pkg-config.
include(CMakePackageConfigHelpers)

# A sanitizer build's libraries call into the sanitizer runtime, so whatever
# links an installed copy of them must link that runtime too.
if(MAPCORE_SANITIZE)
  set_property(TARGET pal APPEND PROPERTY INTERFACE_LINK_OPTIONS
               $<INSTALL_INTERFACE:-fsanitize=${MAPCORE_SANITIZE}>)
endif()

install(TARGETS pal mapcore_http mapcore
        EXPORT mapcoreTargets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/pal/include/ ${PROJECT_SOURCE_DIR}/http/include/
                  ${PROJECT_SOURCE_DIR}/core/
        DESTINATION ${MAPCORE_INSTALL_INCLUDEDIR}
        FILES_MATCHING PATTERN "*.h")

set(MAPCORE_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/mapcore)
install(EXPORT mapcoreTargets NAMESPACE mapcore:: DESTINATION ${MAPCORE_CMAKE_DIR})
configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/mapcoreConfig.cmake.in
                              ${PROJECT_BINARY_DIR}/mapcoreConfig.cmake
                              INSTALL_DESTINATION ${MAPCORE_CMAKE_DIR})
install(FILES ${PROJECT_BINARY_DIR}/mapcoreConfig.cmake ${PROJECT_SOURCE_DIR}/cmake/LibraryDependencies.cmake
        DESTINATION ${MAPCORE_CMAKE_DIR})
