# Textures decode the images the image tests check.
target_compile_definitions(${target} PRIVATE MAPCORE_IMAGE_DATA="${area_dir}/../image/data")
