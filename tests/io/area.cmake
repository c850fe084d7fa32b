# The package tool is run end to end by its test.
add_dependencies(${target} mapcore-pak)
target_compile_definitions(${target} PRIVATE MAPCORE_PAK_TOOL="$<TARGET_FILE:mapcore-pak>")
