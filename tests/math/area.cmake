# GeographicLib is the independent reference the distance model is checked against.
target_link_libraries(${target} PRIVATE PkgConfig::GEOGRAPHICLIB)
