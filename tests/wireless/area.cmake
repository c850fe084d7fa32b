# GeographicLib is the independent reference for the accuracy bounds.
target_link_libraries(${target} PRIVATE PkgConfig::GEOGRAPHICLIB)
