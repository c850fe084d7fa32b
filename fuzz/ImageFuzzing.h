#pragma once

#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <cstdint>

#include "FuzzSupport.h"
#include "image/Image.h"
#include "io/ByteArrayInputStream.h"

// What the image fuzz targets share: decode, then hold the decoder to its
// promises about the layout of what it returns.
namespace image_fuzz {

inline void exercise(const uint8_t* data, size_t size, Image::ImageFormat format) {
    fuzz::bootPlatform();
    IO::ByteArrayInputStream in(data, static_cast<int>(size));
    boost::shared_ptr<Image> image = Image::createImage(&in, format);
    if (!image) {
        return;
    }
    fuzz::check(image->getWidth() <= Image::kMaxSide && image->getHeight() <= Image::kMaxSide,
                "size within the limit");
    fuzz::check(image->getStride() == image->getWidth() * image->getBitsPerPixel() / 8,
                "rows without padding");
    fuzz::check(image->getSize() == image->getPaletteSize() * image->getPaletteBitsPerEntry() / 8 +
                                        image->getStride() * image->getHeight(),
                "size matches the layout");
    // Reading every byte lets the sanitizers see an array shorter than its size.
    unsigned sum = 0;
    for (unsigned i = 0; i < image->getSize(); ++i) {
        sum += image->getData()[i];
    }
    image->inverse();
    boost::shared_ptr<Image> copy = image->clone();
    fuzz::check(copy->getSize() == image->getSize(), "a clone has the same size");
    (void)sum;
}

}  // namespace image_fuzz
