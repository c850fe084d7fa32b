#pragma once

#include "render/api/GraphicsResource.h"
#include "render/api/Types.h"

namespace Render {
namespace API {

// A two-dimensional texture on the device. Drawing thread only.
class Texture2D : public GraphicsResource {
public:
    // Replaces a rectangle of pixels in the texture's format; row 0 of data
    // goes to row y. Not available for paletted textures.
    virtual void setSubData(const void* data, int x, int y, int width, int height) = 0;

    virtual unsigned getWidth() const = 0;
    virtual unsigned getHeight() const = 0;
    virtual TextureFormat getFormat() const = 0;
};

}  // namespace API
}  // namespace Render
