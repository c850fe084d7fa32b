# The protobuf adapter is tested with a real message compiled by protoc.
find_program(PROTOC_EXECUTABLE protoc REQUIRED)
set(util_proto_source ${area_dir}/TestPlace.proto)
set(util_proto_out ${CMAKE_CURRENT_BINARY_DIR}/util_proto)
add_custom_command(
  OUTPUT ${util_proto_out}/TestPlace.pb.cc ${util_proto_out}/TestPlace.pb.h
  COMMAND ${CMAKE_COMMAND} -E make_directory ${util_proto_out}
  COMMAND ${PROTOC_EXECUTABLE} --cpp_out=${util_proto_out} -I ${area_dir} ${util_proto_source}
  DEPENDS ${util_proto_source}
  COMMENT "Generating TestPlace.pb.cc"
  VERBATIM)
target_sources(${target} PRIVATE ${util_proto_out}/TestPlace.pb.cc)
# Generated code is not ours to keep free of warnings.
set_source_files_properties(${util_proto_out}/TestPlace.pb.cc PROPERTIES COMPILE_OPTIONS -w)
target_include_directories(${target} PRIVATE ${util_proto_out})
target_link_libraries(${target} PRIVATE PkgConfig::PROTOBUF PkgConfig::ZLIB)
