#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "image/Image.h"
#include "render/ResourceDesc.h"

namespace Render {

// The descriptor of one image to draw: where its pixels come from (an
// accessor) and how it is sampled. The image is decoded at construction, so
// its size is known at once; it is held until the texture is cached and then
// released, leaving only the device copy (see TextureResource).
//
// Threads: constructed and decoded on any one thread; cached, drawn and
// released on the drawing thread afterwards (a ResourceDesc).
class Texture : public ResourceDesc {
public:
    // 1 linear, 2 trilinear, anything else nearest.
    typedef int Filter;
    // 1 repeat, anything else clamp to edge.
    typedef int WrapMode;

    // Where the pixels come from. getImage() decodes anew at every call
    // (except the single-access kind) and applies Image::inverse when asked
    // to; a failure is logged, asserted, and gives an empty image.
    // Accessors touch only their own data: any thread.
    class Accessor {
    public:
        virtual ~Accessor() {}
        virtual boost::shared_ptr<Image> getImage() = 0;

        static boost::shared_ptr<Accessor> createRawFileAccessor(bool inverse, Image::ImageFormat format,
                                                                 const std::string& path);
        static boost::shared_ptr<Accessor> createResourceFileAccessor(bool inverse, Image::ImageFormat format,
                                                                      const std::string& path);
        // The bytes are copied.
        static boost::shared_ptr<Accessor> createBytesAccessor(bool inverse, Image::ImageFormat format,
                                                               const std::vector<unsigned char>& bytes);
        static boost::shared_ptr<Accessor> createRawBytesAccessor(bool inverse,
                                                                  const std::vector<unsigned char>& bytes,
                                                                  unsigned width, unsigned height,
                                                                  unsigned bitsPerPixel);
        // Hands the image out once; a second access fails.
        static boost::shared_ptr<Accessor> createSingleAccessImageAccessor(
            bool inverse, const boost::shared_ptr<Image>& image);

    protected:
        explicit Accessor(bool inverse) : inverse(inverse) {}
        // Applies the inversion when asked to; asserts on an empty image.
        boost::shared_ptr<Image> deliver(const boost::shared_ptr<Image>& image) const;

        bool inverse;
    };

    Texture(const boost::shared_ptr<Accessor>& accessor, Filter filter, WrapMode wrapS, WrapMode wrapT);

    // The held image, decoded through the accessor when none is held (an
    // assertion when that fails).
    boost::shared_ptr<Image> getImage() const;
    // Drops the held image.
    void release() const;
    // Holds an image again (decoding it anew), for callers that need the
    // pixels after the upload.
    void onCached() const;

    Filter getFilter() const { return filter; }
    WrapMode getWrapS() const { return wrapS; }
    WrapMode getWrapT() const { return wrapT; }
    // The decoded image's size in pixels; 0 when it could not be decoded.
    unsigned getWidth() const { return width; }
    unsigned getHeight() const { return height; }
    bool isImageHeld() const { return image.get() != nullptr; }

private:
    boost::shared_ptr<Accessor> accessor;
    Filter filter;
    WrapMode wrapS;
    WrapMode wrapT;
    unsigned width;
    unsigned height;
    mutable boost::shared_ptr<Image> image;
};

}  // namespace Render
