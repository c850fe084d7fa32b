# The uploads are decoded by an independent implementation (Python's gzip and
# XML parser).
target_compile_definitions(${target} PRIVATE UPLOAD_DECODER="${area_dir}/decode_upload.py")
