#pragma once

#include <pal/Simulation.h>

#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "image/Image.h"
#include "io/ByteArrayInputStream.h"

// What the image fuzz targets share. Decoding needs no running platform
// layer, only a quiet log and assertions that return (as in a release
// build); a broken promise of the decoder stops the run as a finding.
namespace image_fuzz {

inline void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "image fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

inline bool quietPlatform() {
    pal::setAssertionHandler([](const char*, const char*, int) {});
    pal::setLogSink([](const char*) {});
    return true;
}

inline void exercise(const uint8_t* data, size_t size, Image::ImageFormat format) {
    static const bool quiet = quietPlatform();
    (void)quiet;
    IO::ByteArrayInputStream in(data, static_cast<int>(size));
    boost::shared_ptr<Image> image = Image::createImage(&in, format);
    if (!image) {
        return;
    }
    check(image->getWidth() <= Image::kMaxSide && image->getHeight() <= Image::kMaxSide,
          "size within the limit");
    check(image->getStride() == image->getWidth() * image->getBitsPerPixel() / 8, "rows without padding");
    check(image->getSize() == image->getPaletteSize() * image->getPaletteBitsPerEntry() / 8 +
                                  image->getStride() * image->getHeight(),
          "size matches the layout");
    // Reading every byte lets the sanitizers see an array shorter than its size.
    unsigned sum = 0;
    for (unsigned i = 0; i < image->getSize(); ++i) {
        sum += image->getData()[i];
    }
    image->inverse();
    boost::shared_ptr<Image> copy = image->clone();
    check(copy->getSize() == image->getSize(), "a clone has the same size");
    (void)sum;
}

}  // namespace image_fuzz
