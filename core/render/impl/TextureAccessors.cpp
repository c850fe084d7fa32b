#include "render/impl/TextureAccessors.h"

#include <KD/kd.h>

#include "io/ByteArrayInputStream.h"
#include "util/Logger.h"

namespace Render {

boost::shared_ptr<Image> FileAccessor::getImage() {
    boost::shared_ptr<Image> image = loader(path.c_str(), format);
    if (!image) {
        Logger::log(Logger::Info, "Image %s could not be read", path.c_str());
    }
    return deliver(image);
}

boost::shared_ptr<Image> BytesAccessor::getImage() {
    IO::ByteArrayInputStream in(bytes.data(), static_cast<int>(bytes.size()));
    boost::shared_ptr<Image> image = Image::createImage(&in, format);
    if (!image) {
        Logger::log(Logger::Info, "Image from bytes could not be read");
    }
    return deliver(image);
}

boost::shared_ptr<Image> RawBytesAccessor::getImage() {
    boost::shared_ptr<Image> image = Image::createImage(bytes, width, height, bitsPerPixel);
    if (!image) {
        Logger::log(Logger::Info, "Image from bytes could not be read");
    }
    return deliver(image);
}

boost::shared_ptr<Image> SingleAccessImageAccessor::getImage() {
    boost::shared_ptr<Image> handedOut;
    handedOut.swap(image);
    if (!handedOut) {
        Logger::log(Logger::Info, "Image already been accessed");
    }
    return deliver(handedOut);
}

boost::shared_ptr<Image> Texture::Accessor::deliver(const boost::shared_ptr<Image>& image) const {
    KD_ASSERT(image);
    if (image && inverse) {
        image->inverse();
    }
    return image;
}

boost::shared_ptr<Texture::Accessor> Texture::Accessor::createRawFileAccessor(bool inverse,
                                                                              Image::ImageFormat format,
                                                                              const std::string& path) {
    return boost::shared_ptr<Accessor>(
        new FileAccessor(inverse, format, path, FileAccessor::Loader::make<&Image::createImageFromFile>()));
}

boost::shared_ptr<Texture::Accessor> Texture::Accessor::createResourceFileAccessor(bool inverse,
                                                                                   Image::ImageFormat format,
                                                                                   const std::string& path) {
    return boost::shared_ptr<Accessor>(new FileAccessor(
        inverse, format, path, FileAccessor::Loader::make<&Image::createImageFromResource>()));
}

boost::shared_ptr<Texture::Accessor> Texture::Accessor::createBytesAccessor(
    bool inverse, Image::ImageFormat format, const std::vector<unsigned char>& bytes) {
    return boost::shared_ptr<Accessor>(new BytesAccessor(inverse, format, bytes));
}

boost::shared_ptr<Texture::Accessor> Texture::Accessor::createRawBytesAccessor(
    bool inverse, const std::vector<unsigned char>& bytes, unsigned width, unsigned height,
    unsigned bitsPerPixel) {
    return boost::shared_ptr<Accessor>(new RawBytesAccessor(inverse, bytes, width, height, bitsPerPixel));
}

boost::shared_ptr<Texture::Accessor> Texture::Accessor::createSingleAccessImageAccessor(
    bool inverse, const boost::shared_ptr<Image>& image) {
    return boost::shared_ptr<Accessor>(new SingleAccessImageAccessor(inverse, image));
}

}  // namespace Render
