// PNG files through Image::createImage. A decoded image must be as large as
// its layout says, readable to the last byte, and survive inversion and
// cloning; anything else must be refused without a crash.
#include <cstddef>
#include <cstdint>

#include "ImageFuzzing.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    image_fuzz::exercise(data, size, Image::PNG);
    return 0;
}
