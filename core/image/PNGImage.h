#pragma once

#include "image/Image.h"

// Decodes PNG through libpng into the layouts of Image: palette images keep
// their palette (one index byte per pixel), gray becomes 8 bits, RGB 24 and
// RGBA 32. Deeper or packed samples are converted by libpng: 16-bit channels
// keep their high byte, gray below 8 bits is scaled to 0..255, gray with
// alpha becomes RGBA, and interlaced images are assembled whole. Transparency
// chunks and gamma are ignored. One thread at a time.
class PNGImage : public Image {
protected:
    friend class Image;

    PNGImage() {}

    bool init(IO::InputStream* in) override;

private:
    bool decode(struct png_struct_def* png, struct png_info_def* info, IO::InputStream* in);
    bool prepareLayout(struct png_struct_def* png, struct png_info_def* info);
    void copyPalette(struct png_struct_def* png, struct png_info_def* info);
};
