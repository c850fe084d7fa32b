#include "image/Image.h"

#include <KD/kd.h>

#include <cstring>

#include "image/JPGImage.h"
#include "image/PNGImage.h"
#include "io/FileManager.h"
#include "io/InputStream.h"
#include "math/Color.h"

namespace {

const unsigned kMaxBitsPerPixel = 32;

}  // namespace

Image::Image() : width(0), height(0), bitsPerPixel(0), stride(0), paletteBitsPerEntry(0), paletteSize(0) {}

Image::~Image() {}

bool Image::init(IO::InputStream*) {
    return false;
}

boost::shared_ptr<Image> Image::createImage(IO::InputStream* in, ImageFormat format) {
    if (in == nullptr) {
        return boost::shared_ptr<Image>();
    }
    boost::shared_ptr<Image> image;
    switch (format) {
        case PNG:
            image.reset(new PNGImage());
            break;
        case JPEG:
            image.reset(new JPGImage());
            break;
        default:
            KD_ASSERT(false);
            return image;
    }
    if (!image->init(in)) {
        image.reset();
    }
    return image;
}

boost::shared_ptr<Image> Image::createImageFromFile(const char* path, ImageFormat format) {
    boost::shared_ptr<IO::InputStream> in = IO::FileManager::openInput(path);
    return createImage(in.get(), format);
}

boost::shared_ptr<Image> Image::createImageFromResource(const char* name, ImageFormat format) {
    boost::shared_ptr<IO::InputStream> in = IO::FileManager::openInputRes(name);
    return createImage(in.get(), format);
}

boost::shared_ptr<Image> Image::createImage(const std::vector<unsigned char>& pixels, unsigned width,
                                            unsigned height, unsigned bitsPerPixel) {
    boost::shared_ptr<Image> image(new Image());
    if (!image->allocate(width, height, bitsPerPixel, 0, 0) || pixels.size() < image->getSize()) {
        return boost::shared_ptr<Image>();
    }
    if (image->getSize() != 0) {
        std::memcpy(image->data.get(), pixels.data(), image->getSize());
    }
    return image;
}

boost::shared_ptr<Image> Image::clone() const {
    boost::shared_ptr<Image> copy(new Image());
    copy->width = width;
    copy->height = height;
    copy->bitsPerPixel = bitsPerPixel;
    copy->stride = stride;
    copy->paletteBitsPerEntry = paletteBitsPerEntry;
    copy->paletteSize = paletteSize;
    if (getSize() != 0 && data) {
        copy->data.reset(new unsigned char[getSize()]);
        std::memcpy(copy->data.get(), data.get(), getSize());
    }
    return copy;
}

void Image::inverse() {
    const bool palette = paletteSize != 0;
    const unsigned elementSize = (palette ? paletteBitsPerEntry : bitsPerPixel) / 8;
    const unsigned count = palette ? paletteSize : width * height;
    if (elementSize < 3 || !data) {
        return;
    }
    unsigned char* element = data.get();
    for (unsigned i = 0; i < count; ++i, element += elementSize) {
        KDuint32 inverted = Math::Color(element[0], element[1], element[2], 255).inverseRGB();
        element[0] = static_cast<unsigned char>(inverted);
        element[1] = static_cast<unsigned char>(inverted >> 8);
        element[2] = static_cast<unsigned char>(inverted >> 16);
    }
}

unsigned Image::getSize() const {
    return paletteSize * paletteBitsPerEntry / 8 + stride * height;
}

const unsigned char* Image::getPixels() const {
    return data ? data.get() + paletteSize * paletteBitsPerEntry / 8 : nullptr;
}

bool Image::allocate(unsigned newWidth, unsigned newHeight, unsigned newBitsPerPixel, unsigned newPaletteSize,
                     unsigned newPaletteBitsPerEntry) {
    reset();
    // With both sides bounded the size fits in 32 bits: 8192 × 8192 × 4 bytes.
    if (newWidth > kMaxSide || newHeight > kMaxSide || newBitsPerPixel % 8 != 0 ||
        newBitsPerPixel > kMaxBitsPerPixel || newPaletteSize > 256 || newPaletteBitsPerEntry % 8 != 0 ||
        newPaletteBitsPerEntry > kMaxBitsPerPixel) {
        return false;
    }
    width = newWidth;
    height = newHeight;
    bitsPerPixel = newBitsPerPixel;
    stride = newWidth * (newBitsPerPixel / 8);
    paletteSize = newPaletteSize;
    paletteBitsPerEntry = newPaletteBitsPerEntry;
    if (getSize() != 0) {
        // Decoders write every row; only the palette, which files may fill in
        // part, starts zeroed.
        data.reset(new unsigned char[getSize()]);
        std::memset(data.get(), 0, newPaletteSize * newPaletteBitsPerEntry / 8);
    }
    return true;
}

void Image::reset() {
    width = 0;
    height = 0;
    bitsPerPixel = 0;
    stride = 0;
    paletteSize = 0;
    paletteBitsPerEntry = 0;
    data.reset();
}
