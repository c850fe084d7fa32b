#pragma once

#include "image/Image.h"

// Decodes JPEG through libjpeg: gray images become 8 bits per pixel, colour
// ones 24 (R, G, B). A stream that ends early still decodes, with a warning
// and the missing part left as the library fills it. Images of other than one
// (gray) or three colour components are refused before anything is allocated
// for them, and so are progressive or multi-scan images whose buffering
// would take the library more than 16 MiB plus 64 bytes per byte of the file.
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
