# The host's timegm is the calendar tests' reference for dates before 1902 and
# after 2038, which a 32-bit ARM host reaches only with its 64-bit time_t.
target_compile_definitions(${target} PRIVATE _FILE_OFFSET_BITS=64 _TIME_BITS=64)
