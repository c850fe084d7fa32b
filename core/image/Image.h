#pragma once

#include <boost/scoped_array.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

namespace IO {
class InputStream;
}

// An in-memory bitmap: the palette, if any, followed by the rows top to
// bottom, each getStride() bytes without padding. 24 bits per pixel are R, G,
// B; 32 are R, G, B, A; 8 are one gray byte, or one palette index when a
// palette (256 entries of R, G, B) is present.
//
// Decoded images never exceed kMaxSide pixels on either side; larger ones are
// refused before anything is allocated.
//
// Threads: an image is used by one thread at a time; decoding shares no
// state, so different images may be decoded on different threads at once.
class Image {
public:
    typedef int ImageFormat;
    static constexpr ImageFormat PNG = 0;
    static constexpr ImageFormat JPEG = 1;

    static constexpr unsigned kMaxSide = 8192;

    Image();
    virtual ~Image();

    // Decodes the stream with the decoder of format; empty when in is null,
    // the format is unknown (an assertion) or decoding fails, also for want
    // of memory.
    static boost::shared_ptr<Image> createImage(IO::InputStream* in, ImageFormat format);
    // Empty when the file cannot be opened or does not decode.
    static boost::shared_ptr<Image> createImageFromFile(const char* path, ImageFormat format);
    // A file of the resource packages (or its "/data" override).
    static boost::shared_ptr<Image> createImageFromResource(const char* name, ImageFormat format);
    // A copy of the first width × height × bitsPerPixel / 8 bytes of pixels;
    // empty when pixels holds fewer or the image would be too large.
    static boost::shared_ptr<Image> createImage(const std::vector<unsigned char>& pixels, unsigned width,
                                                unsigned height, unsigned bitsPerPixel);

    // Empty when there is no memory for the copy.
    boost::shared_ptr<Image> clone() const;
    // Inverts the brightness of every colour (palette entries when there is a
    // palette, else pixels) and keeps alpha; gray and indexed pixels without
    // palette stay as they are.
    void inverse();

    unsigned getWidth() const { return width; }
    unsigned getHeight() const { return height; }
    unsigned getBitsPerPixel() const { return bitsPerPixel; }
    unsigned getStride() const { return stride; }
    unsigned getPaletteBitsPerEntry() const { return paletteBitsPerEntry; }
    unsigned getPaletteSize() const { return paletteSize; }
    // Bytes of getData(): the palette and the rows.
    unsigned getSize() const;
    const unsigned char* getData() const { return data.get(); }
    unsigned char* getData() { return data.get(); }
    // The first row, after the palette.
    const unsigned char* getPixels() const;

protected:
    // Reads the image from in; false when it cannot. Image itself reads nothing.
    virtual bool init(IO::InputStream* in);

    // Sets the layout and allocates data for it, with a zeroed palette (no
    // array when the size is 0); false, leaving the image empty, when a side is above
    // kMaxSide, the bits per pixel are not whole bytes up to 32 or memory runs short.
    bool allocate(unsigned newWidth, unsigned newHeight, unsigned newBitsPerPixel, unsigned newPaletteSize,
                  unsigned newPaletteBitsPerEntry);
    void reset();

    unsigned width;
    unsigned height;
    unsigned bitsPerPixel;
    unsigned stride;
    boost::scoped_array<unsigned char> data;
    unsigned paletteBitsPerEntry;
    unsigned paletteSize;

private:
    Image(const Image&) = delete;
    Image& operator=(const Image&) = delete;
};
