# The scenario runs against the development server with the demo's server
# configuration and drive.
target_link_libraries(${target} PRIVATE mapcore_devserver)
target_compile_definitions(${target} PRIVATE MAPCORE_DEMO_DATA="${CMAKE_SOURCE_DIR}/examples/demo/data")
