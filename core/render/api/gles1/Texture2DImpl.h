#pragma once

#include <GLES/gl.h>

#include "render/api/Texture2D.h"

namespace Render {
namespace API {
namespace GLES1 {

// A GL texture object. Drawing thread only, with its context current.
class Texture2DImpl : public Texture2D {
public:
    Texture2DImpl(unsigned width, unsigned height, TextureFormat format, TextureFilter filter,
                  TextureWrap wrapS, TextureWrap wrapT, const void* data);
    ~Texture2DImpl() override {}

    // Deletes the GL texture; a second call does nothing.
    void release() override;
    void setSubData(const void* data, int x, int y, int width, int height) override;

    unsigned getWidth() const override { return width; }
    unsigned getHeight() const override { return height; }
    TextureFormat getFormat() const override { return format; }
    // The GL texture name; 0 once released.
    GLuint getName() const { return name; }

private:
    void upload(const void* data);

    GLuint name;
    unsigned width;
    unsigned height;
    TextureFormat format;
};

}  // namespace GLES1
}  // namespace API
}  // namespace Render
