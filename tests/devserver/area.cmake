# The server is tested over real HTTP on loopback; uploads are encoded by an
# independent implementation (Python's gzip) with this build's constants.
target_link_libraries(${target} PRIVATE mapcore_devserver)
target_compile_definitions(${target} PRIVATE UPLOAD_ENCODER="${area_dir}/encode_upload.py")
