#pragma once

#include <boost/shared_ptr.hpp>

#include "render/Resource.h"

class Image;

namespace Render {

namespace API {
class Texture2D;
}

class Texture;

// The device texture of a Texture. Its sides are the powers of two that hold
// the image; a smaller image is uploaded into the corner at the origin with
// one sub-image update rather than resampled. The decoded image is released
// by caching. Drawing thread only (caching and clearing).
class TextureResource : public Resource {
public:
    explicit TextureResource(const Texture* texture);

    const boost::shared_ptr<API::Texture2D>& getTexture2D() const { return texture2D; }
    unsigned getTextureWidth() const { return textureWidth; }
    unsigned getTextureHeight() const { return textureHeight; }

protected:
    void doCache(API::GraphicsDevice* device) override;
    void doClear(API::GraphicsDevice* device) override;

private:
    void upload(API::GraphicsDevice* device, const Image& image);
    void uploadPaletted(API::GraphicsDevice* device, const Image& image);

    const Texture* texture;
    boost::shared_ptr<API::Texture2D> texture2D;
    unsigned textureWidth;
    unsigned textureHeight;
};

}  // namespace Render
