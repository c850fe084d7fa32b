#pragma once

#include "image/Image.h"

// Decodes JPEG through libjpeg: gray images become 8 bits per pixel, colour
// ones 24 (R, G, B). A stream that ends early still decodes, with a warning
// and the missing part left as the library fills it; CMYK images are refused.
// Messages of the library are logged at error level. One thread at a time.
class JPGImage : public Image {
protected:
    friend class Image;

    JPGImage() {}

    bool init(IO::InputStream* in) override;

private:
    bool decode(struct jpeg_decompress_struct* cinfo);
    bool prepareLayout(struct jpeg_decompress_struct* cinfo);
};
