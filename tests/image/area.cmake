# Decoder inputs made by independent encoders (see data/make_images.py).
target_compile_definitions(${target} PRIVATE MAPCORE_IMAGE_DATA="${area_dir}/data")
