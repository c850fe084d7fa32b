#include "render/TextureResource.h"

#include <KD/kd.h>

#include <vector>

#include "image/Image.h"
#include "render/Texture.h"
#include "render/api/GraphicsDevice.h"
#include "render/api/Texture2D.h"

namespace Render {

namespace {

unsigned powerOfTwoAtLeast(unsigned side) {
    unsigned power = 1;
    while (power < side) {
        power <<= 1;
    }
    return power;
}

API::TextureFilter deviceFilter(Texture::Filter filter) {
    switch (filter) {
        case 1:
            return API::FILTER_LINEAR;
        case 2:
            return API::FILTER_TRILINEAR;
        default:
            return API::FILTER_NEAREST;
    }
}

API::TextureWrap deviceWrap(Texture::WrapMode wrap) {
    return wrap == 1 ? API::WRAP_REPEAT : API::WRAP_CLAMP;
}

// Palette entries are R, G, B; indices pick one of the 256.
std::vector<unsigned char> expandPalette(const Image& image) {
    const unsigned char* palette = image.getData();
    const unsigned char* index = image.getPixels();
    const size_t pixels = static_cast<size_t>(image.getWidth()) * image.getHeight();
    std::vector<unsigned char> rgb(pixels * 3);
    for (size_t i = 0; i < pixels; ++i) {
        const unsigned char* entry = palette + 3 * index[i];
        rgb[3 * i] = entry[0];
        rgb[3 * i + 1] = entry[1];
        rgb[3 * i + 2] = entry[2];
    }
    return rgb;
}

}  // namespace

TextureResource::TextureResource(const Texture* texture)
    : texture(texture), textureWidth(0), textureHeight(0) {}

void TextureResource::doCache(API::GraphicsDevice* device) {
    boost::shared_ptr<Image> image = texture->getImage();
    // Only the device copy is kept once the upload is under way.
    texture->release();
    KD_ASSERT(device != nullptr);
    if (!image || device == nullptr) {
        return;
    }
    textureWidth = powerOfTwoAtLeast(image->getWidth());
    textureHeight = powerOfTwoAtLeast(image->getHeight());
    if (image->getPaletteSize() != 0) {
        uploadPaletted(device, *image);
    } else {
        upload(device, *image);
    }
}

void TextureResource::doClear(API::GraphicsDevice*) {
    if (texture2D) {
        texture2D->release();
        texture2D.reset();
    }
}

void TextureResource::upload(API::GraphicsDevice* device, const Image& image) {
    API::TextureFormat format;
    switch (image.getBitsPerPixel()) {
        case 32:
            format = API::FORMAT_RGBA;
            break;
        case 24:
            format = API::FORMAT_RGB;
            break;
        case 8:
            format = API::FORMAT_ALPHA;
            break;
        default:
            kdHandleAssertion("unsupported bits per pixel", __FILE__, __LINE__);
            return;
    }
    const API::TextureFilter filter = deviceFilter(texture->getFilter());
    const API::TextureWrap wrapS = deviceWrap(texture->getWrapS());
    const API::TextureWrap wrapT = deviceWrap(texture->getWrapT());
    if (image.getWidth() == textureWidth && image.getHeight() == textureHeight) {
        texture2D = device->createTexture2D(textureWidth, textureHeight, format, filter, wrapS, wrapT,
                                            image.getPixels());
        return;
    }
    texture2D = device->createTexture2D(textureWidth, textureHeight, format, filter, wrapS, wrapT, nullptr);
    if (texture2D) {
        texture2D->setSubData(image.getPixels(), 0, 0, image.getWidth(), image.getHeight());
    }
}

// The image's palette and indices are laid out exactly as the device's
// paletted format wants them; but a paletted texture cannot be updated in
// part, so one that needs padding to a power of two goes up as RGB.
void TextureResource::uploadPaletted(API::GraphicsDevice* device, const Image& image) {
    const API::TextureFilter filter = deviceFilter(texture->getFilter());
    const API::TextureWrap wrapS = deviceWrap(texture->getWrapS());
    const API::TextureWrap wrapT = deviceWrap(texture->getWrapT());
    if (image.getWidth() == textureWidth && image.getHeight() == textureHeight) {
        texture2D = device->createTexture2D(textureWidth, textureHeight, API::FORMAT_PALETTE8_RGB8, filter,
                                            wrapS, wrapT, image.getData());
        return;
    }
    std::vector<unsigned char> rgb = expandPalette(image);
    texture2D =
        device->createTexture2D(textureWidth, textureHeight, API::FORMAT_RGB, filter, wrapS, wrapT, nullptr);
    if (texture2D) {
        texture2D->setSubData(rgb.data(), 0, 0, image.getWidth(), image.getHeight());
    }
}

}  // namespace Render
