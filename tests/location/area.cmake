# The GPX reader is checked against a track written by Python's XML library.
target_compile_definitions(${target} PRIVATE MAPCORE_LOCATION_DATA="${CMAKE_SOURCE_DIR}/tests/data/location")
