#include "render/api/gles1/Texture2DImpl.h"

#include <GLES/glext.h>
#include <KD/kd.h>

namespace Render {
namespace API {
namespace GLES1 {

namespace {

const unsigned kPaletteBytes = 256 * 3;

GLenum glFormat(TextureFormat format) {
    switch (format) {
        case FORMAT_RGB:
            return GL_RGB;
        case FORMAT_RGBA:
            return GL_RGBA;
        case FORMAT_ALPHA:
            return GL_ALPHA;
        case FORMAT_LUMINANCE:
            return GL_LUMINANCE;
        case FORMAT_PALETTE8_RGB8:
            return GL_PALETTE8_RGB8_OES;
    }
    KD_ASSERT(false);
    return GL_RGBA;
}

void setFilter(TextureFilter filter) {
    GLint minFilter = GL_NEAREST;
    GLint magFilter = GL_NEAREST;
    if (filter == FILTER_LINEAR) {
        minFilter = GL_LINEAR;
        magFilter = GL_LINEAR;
    } else if (filter == FILTER_TRILINEAR) {
        minFilter = GL_LINEAR_MIPMAP_LINEAR;
        magFilter = GL_LINEAR;
        // Must be set before the upload that should fill the mipmaps.
        glTexParameteri(GL_TEXTURE_2D, GL_GENERATE_MIPMAP, GL_TRUE);
    }
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MIN_FILTER, minFilter);
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MAG_FILTER, magFilter);
}

GLint glWrap(TextureWrap wrap) {
    return wrap == WRAP_REPEAT ? GL_REPEAT : GL_CLAMP_TO_EDGE;
}

}  // namespace

Texture2DImpl::Texture2DImpl(unsigned width, unsigned height, TextureFormat format, TextureFilter filter,
                             TextureWrap wrapS, TextureWrap wrapT, const void* data)
    : name(0), width(width), height(height), format(format) {
    glGenTextures(1, &name);
    glBindTexture(GL_TEXTURE_2D, name);
    setFilter(filter);
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_WRAP_S, glWrap(wrapS));
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_WRAP_T, glWrap(wrapT));
    upload(data);
    glBindTexture(GL_TEXTURE_2D, 0);
}

void Texture2DImpl::upload(const void* data) {
    const GLenum pixelFormat = glFormat(format);
    if (format == FORMAT_PALETTE8_RGB8) {
        // The palette is the data: there is no paletted texture without it.
        KD_ASSERT(data != nullptr);
        if (data == nullptr) {
            return;
        }
        glCompressedTexImage2D(GL_TEXTURE_2D, 0, pixelFormat, width, height, 0,
                               width * height + kPaletteBytes, data);
        return;
    }
    // Our rows are packed; GL would otherwise expect them padded to 4 bytes.
    glPixelStorei(GL_UNPACK_ALIGNMENT, 1);
    glTexImage2D(GL_TEXTURE_2D, 0, pixelFormat, width, height, 0, pixelFormat, GL_UNSIGNED_BYTE, data);
}

void Texture2DImpl::release() {
    if (name != 0) {
        glDeleteTextures(1, &name);
        name = 0;
    }
}

void Texture2DImpl::setSubData(const void* data, int x, int y, int subWidth, int subHeight) {
    // Paletted textures are compressed in GL terms: they cannot be updated in part.
    KD_ASSERT(format != FORMAT_PALETTE8_RGB8);
    if (format == FORMAT_PALETTE8_RGB8 || name == 0) {
        return;
    }
    const GLenum pixelFormat = glFormat(format);
    glBindTexture(GL_TEXTURE_2D, name);
    glPixelStorei(GL_UNPACK_ALIGNMENT, 1);
    glTexSubImage2D(GL_TEXTURE_2D, 0, x, y, subWidth, subHeight, pixelFormat, GL_UNSIGNED_BYTE, data);
    glBindTexture(GL_TEXTURE_2D, 0);
}

}  // namespace GLES1
}  // namespace API
}  // namespace Render
