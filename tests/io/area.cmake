# The package tool is run end to end by its test, under the same emulator as
# the test when cross-compiling.
add_dependencies(${target} mapcore-pak)
list(JOIN CMAKE_CROSSCOMPILING_EMULATOR " " tool_emulator)
string(STRIP "${tool_emulator} $<TARGET_FILE:mapcore-pak>" tool_command)
target_compile_definitions(${target} PRIVATE MAPCORE_PAK_TOOL="${tool_command}")
