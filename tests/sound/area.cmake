# Vorbis test input comes from libvorbisenc, an encoder independent of the
# decoder under test; speexdec checks the Speex encoder's output.
pkg_check_modules(VORBISENC REQUIRED IMPORTED_TARGET vorbisenc vorbis)
target_link_libraries(${target} PRIVATE PkgConfig::VORBISENC)
