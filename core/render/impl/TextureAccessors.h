#pragma once

#include <string>
#include <vector>

#include "render/Texture.h"
#include "util/callback.h"

// The accessor kinds behind Texture::Accessor's factories. Each touches only
// its own data: any thread, one at a time.
namespace Render {

// A file, plain or from the resource packages, decoded at every access.
class FileAccessor : public Texture::Accessor {
public:
    typedef callback<boost::shared_ptr<Image> (*)(const char*, Image::ImageFormat)> Loader;

    FileAccessor(bool inverse, Image::ImageFormat format, const std::string& path, Loader loader)
        : Accessor(inverse), format(format), path(path), loader(loader) {}

    boost::shared_ptr<Image> getImage() override;

private:
    Image::ImageFormat format;
    std::string path;
    Loader loader;
};

// Encoded image bytes of its own.
class BytesAccessor : public Texture::Accessor {
public:
    BytesAccessor(bool inverse, Image::ImageFormat format, const std::vector<unsigned char>& bytes)
        : Accessor(inverse), format(format), bytes(bytes) {}

    boost::shared_ptr<Image> getImage() override;

private:
    Image::ImageFormat format;
    std::vector<unsigned char> bytes;
};

// Raw pixels of its own.
class RawBytesAccessor : public Texture::Accessor {
public:
    RawBytesAccessor(bool inverse, const std::vector<unsigned char>& bytes, unsigned width, unsigned height,
                     unsigned bitsPerPixel)
        : Accessor(inverse), bytes(bytes), width(width), height(height), bitsPerPixel(bitsPerPixel) {}

    boost::shared_ptr<Image> getImage() override;

private:
    std::vector<unsigned char> bytes;
    unsigned width;
    unsigned height;
    unsigned bitsPerPixel;
};

// An image already in memory, handed out once and then forgotten.
class SingleAccessImageAccessor : public Texture::Accessor {
public:
    SingleAccessImageAccessor(bool inverse, const boost::shared_ptr<Image>& image)
        : Accessor(inverse), image(image) {}

    boost::shared_ptr<Image> getImage() override;

private:
    boost::shared_ptr<Image> image;
};

}  // namespace Render
