#include "image/Image.h"

#include <KD/kd.h>

#include <cstring>
#include <new>

#include "image/JPGImage.h"
#include "image/PNGImage.h"
#include "io/FileManager.h"
#include "io/InputStream.h"
#include "math/Color.h"
#include "util/Logger.h"

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
    if (format != PNG && format != JPEG) {
        KD_ASSERT(false);
        return boost::shared_ptr<Image>();
    }
    // The pixels get no memory through a throwing allocation; whatever else runs short while
    // decoding (the decoders release their state on the way out) is a failed decode too.
    try {
        boost::shared_ptr<Image> image(format == PNG ? static_cast<Image*>(new PNGImage())
                                                     : static_cast<Image*>(new JPGImage()));
        if (!image->init(in)) {
            image.reset();
        }
        return image;
    } catch (const std::bad_alloc&) {
        Logger::log(Logger::Error, "Image: out of memory while decoding");
        return boost::shared_ptr<Image>();
    }
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
        copy->data.reset(new (std::nothrow) unsigned char[getSize()]);
        if (!copy->data) {
            Logger::log(Logger::Error, "Image: no memory for a copy of %u bytes", getSize());
            return boost::shared_ptr<Image>();
        }
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
        // Sized by the file: running short of memory refuses the image.
        data.reset(new (std::nothrow) unsigned char[getSize()]);
        if (!data) {
            Logger::log(Logger::Error, "Image: no memory for %ux%u pixels of %u bits", newWidth, newHeight,
                        newBitsPerPixel);
            reset();
            return false;
        }
        // Decoders write every row; only the palette, which files may fill in
        // part, starts zeroed.
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
